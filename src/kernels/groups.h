// SPDX-License-Identifier: Apache-2.0
// Row kernels that rearrange bytes work on groups: a fixed number of pixels that fills whole vectors in every run of
// bytes they read and write. A group says what its runs are and what happens to one group; the loop, the tail and the
// alignment for streaming stores are here, once.
#pragma once
#include <array>

#include "simd.h"

namespace qori::kernels {

/// One row's worth of consecutive pixels in one image.
struct Run {
    int pixelBytes;
    int lastBytes;   ///< Bytes of the row's last pixel that may be touched: less where a channel of interest is meant.
};

constexpr Run wholePixels(int pixelBytes) { return {pixelBytes, pixelBytes}; }
constexpr Run oneChannel(int pixelBytes, int elementBytes) { return {pixelBytes, elementBytes}; }

namespace detail {

/// Up to a group through buffers of a group's size. A run that is read and written (insertion, masks) appears among
/// the inputs with the same pointer.
template <class Group, size_t ins, size_t outs>
QORI_NOINLINE void partialGroup(const Group& group, std::array<uint8_t*, outs> out, std::array<const uint8_t*, ins> in,
                                ptrdiff_t pixels) {
    constexpr auto bytesOf = [](Run run, ptrdiff_t n) { return (n - 1) * run.pixelBytes + run.lastBytes; };
    constexpr auto total = [](const auto& runs) {
        int bytes = 0;
        for (const Run& run : runs) bytes += run.pixelBytes * Group::pixels;
        return static_cast<size_t>(bytes);
    };
    alignas(32) uint8_t inBuffer[total(Group::in)];
    alignas(32) uint8_t outBuffer[total(Group::out)];
    std::array<const uint8_t*, ins> groupIn;
    std::array<uint8_t*, outs> groupOut;
    uint8_t* next = inBuffer;
    for (size_t r = 0; r < ins; ++r) {
        const ptrdiff_t bytes = bytesOf(Group::in[r], pixels);
        for (ptrdiff_t at = 0; at < Group::in[r].pixelBytes * Group::pixels; at += 32)
            store(next + at, loadUpTo(in[r] + at, bytes - at));
        groupIn[r] = next;
        next += Group::in[r].pixelBytes * Group::pixels;
    }
    next = outBuffer;
    for (size_t r = 0; r < outs; ++r) {
        groupOut[r] = next;
        next += Group::out[r].pixelBytes * Group::pixels;
    }
    group.template run<false>(groupOut, groupIn);
    for (size_t r = 0; r < outs; ++r) {
        const ptrdiff_t bytes = bytesOf(Group::out[r], pixels);
        for (ptrdiff_t at = 0; at < bytes; at += 32) storeUpTo(out[r] + at, load(groupOut[r] + at), bytes - at);
    }
}

template <size_t count, class Pointers>
QORI_INLINE void advanceRuns(Pointers& pointers, const std::array<Run, count>& runs, ptrdiff_t pixels) {
    for (size_t r = 0; r < count; ++r) pointers[r] += runs[r].pixelBytes * pixels;
}

/// Pixels until every output is 32-byte aligned, or -1 where that never happens.
template <class Group, size_t outs>
int pixelsToAlignment(const std::array<uint8_t*, outs>& out) {
    for (int pixels = 0; pixels < 32; ++pixels) {
        bool aligned = true;
        for (size_t r = 0; r < outs; ++r)
            aligned &= (reinterpret_cast<uintptr_t>(out[r] + pixels * Group::out[r].pixelBytes) & 31u) == 0;
        if (aligned) return pixels;
    }
    return -1;
}

template <bool streaming, class Group, size_t ins, size_t outs>
QORI_INLINE void wholeGroups(const Group& group, std::array<uint8_t*, outs>& out, std::array<const uint8_t*, ins>& in,
                             ptrdiff_t count) {
    for (; count > 0; --count) {
        group.template run<streaming>(out, in);
        advanceRuns(out, Group::out, Group::pixels);
        advanceRuns(in, Group::in, Group::pixels);
    }
}

}  // namespace detail

template <class Group, size_t ins, size_t outs>
QORI_NOINLINE void mapGroups(const Group& group, std::array<uint8_t*, outs> out, std::array<const uint8_t*, ins> in,
                             ptrdiff_t pixels, bool streaming = false) {
    static_assert(ins == Group::in.size() && outs == Group::out.size());
    // A channel of interest ends inside its last pixel, so that pixel is never part of a whole group.
    constexpr bool endsEarly = [] {
        bool early = false;
        for (const Run& run : Group::in) early |= run.lastBytes < run.pixelBytes;
        for (const Run& run : Group::out) early |= run.lastBytes < run.pixelBytes;
        return early;
    }();
    if constexpr (Group::mayStream) {
        const int head = streaming ? detail::pixelsToAlignment<Group>(out) : -1;
        if (head >= 0 && head < pixels) {
            if (head > 0) {
                for (ptrdiff_t done = 0; done < head; done += Group::pixels) {
                    const ptrdiff_t part = head - done < Group::pixels ? head - done : Group::pixels;
                    detail::partialGroup(group, out, in, part);
                    detail::advanceRuns(out, Group::out, part);
                    detail::advanceRuns(in, Group::in, part);
                }
            }
            pixels -= head;
            const ptrdiff_t count = (pixels - endsEarly) / Group::pixels;
            detail::wholeGroups<true>(group, out, in, count);
            pixels -= count * Group::pixels;
        }
    }
    const ptrdiff_t count = (pixels - endsEarly) / Group::pixels;
    detail::wholeGroups<false>(group, out, in, count);
    pixels -= count * Group::pixels;
    if (pixels > 0) detail::partialGroup(group, out, in, pixels);
}

}  // namespace qori::kernels
