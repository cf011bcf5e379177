// SPDX-License-Identifier: Apache-2.0
// Row kernels that rearrange bytes work on spans: as many pixels as 16 bytes hold elements. Two spans side by side, one
// in each half of the vectors, are a group. A kernel says which runs of bytes it reads and writes and what happens to
// one or two spans; the loop, the tail and the alignment for streaming stores are here, once.
//
// The row's last span begins early enough to end with the row, so it may do pixels again that are done already: the
// images of these kernels never overlap, and what a kernel reads of its destination it writes back.
#pragma once
#include <algorithm>
#include <array>

#include "simd.h"
#include "streamed_lines.h"

namespace qori::kernels {

/// One row's worth of consecutive pixels in one image.
struct Run {
    int pixelBytes;
    int lastBytes;  ///< Bytes of the row's last pixel that may be touched: less where a channel of interest is meant.
};

constexpr Run wholePixels(int pixelBytes) { return {pixelBytes, pixelBytes}; }
constexpr Run oneChannel(int pixelBytes, int elementBytes) { return {pixelBytes, elementBytes}; }

/// Half k of a span with `channels` halves, and of the next span where two are done.
template <int channels, int spans>
QORI_INLINE Bytes loadSpans(const uint8_t* in, int k) {
    if constexpr (spans == 2)
        return loadBlocks(in + 16 * k, in + 16 * (channels + k));
    else
        return {_mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(in + 16 * k)))};
}

template <int channels, int spans>
QORI_INLINE void storeSpans(uint8_t* out, int k, Bytes a) {
    if constexpr (spans == 2)
        storeBlocks(out + 16 * k, out + 16 * (channels + k), a);
    else
        _mm_storeu_si128(reinterpret_cast<__m128i*>(out + 16 * k), _mm256_castsi256_si128(a.v));
}

/// All halves of one or two spans. Two spans are first laid end to end, so that whole vectors are stored.
template <int spans, bool streaming, int channels>
QORI_INLINE void storeAllSpans(uint8_t* out, const Bytes (&halves)[channels]) {
    constexpr int low = 0x20, high = 0x31;  // the low halves of both, the high halves of both
    if constexpr (spans == 1) {
        for (int k = 0; k < channels; ++k) storeSpans<channels, 1>(out, k, halves[k]);
    } else if constexpr (channels == 1) {
        storeAs<streaming>(out, halves[0]);
    } else if constexpr (channels == 3) {
        storeAs<streaming>(out, Bytes{_mm256_permute2x128_si256(halves[0].v, halves[1].v, low)});
        storeAs<streaming>(out + kVectorBytes, Bytes{_mm256_blend_epi32(halves[2].v, halves[0].v, 0xF0)});
        storeAs<streaming>(out + 64, Bytes{_mm256_permute2x128_si256(halves[1].v, halves[2].v, high)});
    } else {
        storeAs<streaming>(out, Bytes{_mm256_permute2x128_si256(halves[0].v, halves[1].v, low)});
        storeAs<streaming>(out + kVectorBytes, Bytes{_mm256_permute2x128_si256(halves[2].v, halves[3].v, low)});
        storeAs<streaming>(out + 64, Bytes{_mm256_permute2x128_si256(halves[0].v, halves[1].v, high)});
        storeAs<streaming>(out + 96, Bytes{_mm256_permute2x128_si256(halves[2].v, halves[3].v, high)});
    }
}

namespace detail {

/// Fewer pixels than a span, through buffers of a span's size. A run that is read and written appears among the
/// inputs with the same pointer.
template <class Kernel, size_t ins, size_t outs>
QORI_INLINE void shortRow(const Kernel& kernel, std::array<uint8_t*, outs> out, std::array<const uint8_t*, ins> in,
                          ptrdiff_t pixels) {
    constexpr int kMost = 64;  // four channels
    alignas(kVectorBytes) uint8_t buffers[ins + outs][kMost];
    std::array<const uint8_t*, ins> from;
    std::array<uint8_t*, outs> to;
    const auto bytesOf = [=](const Run& run) { return (pixels - 1) * run.pixelBytes + run.lastBytes; };
    for (size_t r = 0; r < ins; ++r) {
        const ptrdiff_t bytes = bytesOf(Kernel::in[r]);
        for (int at = 0; at < bytes; at += kVectorBytes) store(buffers[r] + at, loadUpTo(in[r] + at, bytes - at));
        from[r] = buffers[r];
    }
    for (size_t r = 0; r < outs; ++r) to[r] = buffers[ins + r];
    kernel.template run<1, false>(to, from);
    for (size_t r = 0; r < outs; ++r) {
        const ptrdiff_t bytes = bytesOf(Kernel::out[r]);
        for (int at = 0; at < bytes; at += kVectorBytes) storeUpTo(out[r] + at, load(to[r] + at), bytes - at);
    }
}

template <size_t count, class Pointers>
QORI_INLINE void advanceRuns(Pointers& pointers, const std::array<Run, count>& runs, ptrdiff_t pixels) {
    for (size_t r = 0; r < count; ++r) pointers[r] += runs[r].pixelBytes * pixels;
}

/// Pixels until every output is at a cache line, or -1 where that never happens.
template <class Kernel, size_t outs>
int pixelsToLines(const std::array<uint8_t*, outs>& out) {
    for (int pixels = 0; pixels < kCacheLine; ++pixels) {
        bool aligned = true;
        for (size_t r = 0; r < outs; ++r)
            aligned &= reinterpret_cast<uintptr_t>(out[r] + pixels * Kernel::out[r].pixelBytes) % kCacheLine == 0;
        if (aligned) return pixels;
    }
    return -1;
}

/// Whole cache lines of every output, from where all of them begin one; gives how many pixels that made. Apart from
/// the other loops, which are those of short rows too.
template <class Kernel, size_t ins, size_t outs>
QORI_NOINLINE ptrdiff_t streamSpans(const Kernel& kernel, std::array<uint8_t*, outs> out,
                                    std::array<const uint8_t*, ins> in, ptrdiff_t pixels) {
    // Two spans are whole vectors of every output, and as many pixels as a line has bytes are whole lines.
    constexpr int span = Kernel::span, group = 2 * span;
    static_assert(kCacheLine % group == 0);
    constexpr ptrdiff_t narrowest = std::ranges::min(Kernel::out, {}, &Run::pixelBytes).pixelBytes;
    constexpr ptrdiff_t fewest = std::max(kCacheLine, StreamedLines::fewestBytes / narrowest);
    const int head = pixels < fewest ? -1 : pixelsToLines<Kernel>(out);
    if (head < 0 || pixels - head < fewest) return 0;
    const auto advance = [&](ptrdiff_t by) {
        advanceRuns(out, Kernel::out, by);
        advanceRuns(in, Kernel::in, by);
    };
    for (int done = 0; done < head; done += span) {
        kernel.template run<1, false>(out, in);
        advance(std::min(head - done, span));
    }
    const ptrdiff_t inLines = (pixels - head) / kCacheLine * kCacheLine;
    // Behind the end of a row may lie what is not read.
    const ptrdiff_t ahead = pixels * narrowest >= 2 * kFetchedAhead ? kFetchedAhead : 0;
    const auto fetch = [&] {
        [&]<size_t... r>(std::index_sequence<r...>) {
            (fetchLines<group * Kernel::in[r].pixelBytes>(in[r], ahead), ...);
        }
        (std::make_index_sequence<ins>{});
    };
    if constexpr (outs > 1) {
        // Lines of several planes that come in halves, one plane after the other, are often sent in halves.
        static_assert(
            std::ranges::all_of(Kernel::out, [](const Run& run) { return run.pixelBytes * group == kVectorBytes; }));
        alignas(kCacheLine) uint8_t lines[outs][kCacheLine];
        std::array<uint8_t*, outs> first, second;
        for (size_t r = 0; r < outs; ++r) {
            first[r] = lines[r];
            second[r] = lines[r] + kVectorBytes;
        }
        for (ptrdiff_t done = 0; done < inLines; done += 2 * group) {
            for (const auto& half : {first, second}) {
                fetch();
                kernel.template run<2, false>(half, in);
                advanceRuns(in, Kernel::in, group);
            }
            for (size_t r = 0; r < outs; ++r)
                for (ptrdiff_t at = 0; at < kCacheLine; at += kVectorBytes) stream(out[r] + at, load(lines[r] + at));
            advanceRuns(out, Kernel::out, 2 * group);
        }
    } else {
        for (ptrdiff_t done = 0; done < inLines; done += group) {
            fetch();
            kernel.template run<2, true>(out, in);
            advance(group);
        }
    }
    return head + inLines;
}

}  // namespace detail

template <class Kernel, size_t ins, size_t outs>
QORI_INLINE void mapSpans(const Kernel& kernel, std::array<uint8_t*, outs> out, std::array<const uint8_t*, ins> in,
                          ptrdiff_t pixels, bool streaming = false) {
    static_assert(ins == Kernel::in.size() && outs == Kernel::out.size());
    constexpr int span = Kernel::span;
    if (pixels < span) return detail::shortRow(kernel, out, in, pixels);
    const auto advance = [&](ptrdiff_t by) {
        detail::advanceRuns(out, Kernel::out, by);
        detail::advanceRuns(in, Kernel::in, by);
        pixels -= by;
    };
    if constexpr (Kernel::mayStream)
        if (streaming) advance(detail::streamSpans(kernel, out, in, pixels));
    for (ptrdiff_t groups = pixels / (2 * span); groups > 0; --groups) {
        kernel.template run<2, false>(out, in);
        advance(2 * span);
    }
    if (pixels >= span) {
        kernel.template run<1, false>(out, in);
        advance(span);
    }
    if (pixels > 0) {
        advance(pixels - span);
        kernel.template run<1, false>(out, in);
    }
}

}  // namespace qori::kernels
