// SPDX-License-Identifier: Apache-2.0
#include "select_rows.h"

#include "byte_tables.h"
#include "simd.h"

namespace qori::kernels {
namespace {

/// What replaces the selected bytes: another row, or a pixel repeated with a period of 96 bytes.
struct RowSource {
    const uint8_t* row;

    QORI_INLINE const uint8_t* bytes(ptrdiff_t offset) const { return row + offset; }
    QORI_INLINE Bytes at(ptrdiff_t offset) const { return load(row + offset); }
    QORI_INLINE Bytes upTo(ptrdiff_t offset, ptrdiff_t bytes) const { return loadUpTo(row + offset, bytes); }
};

struct PatternSource {
    const Pattern& pattern;

    /// Below the period.
    QORI_INLINE const uint8_t* bytes(ptrdiff_t offset) const { return pattern.bytes + offset; }
    QORI_INLINE Bytes at(ptrdiff_t offset) const { return load(pattern.bytes + offset % Pattern::period); }
    QORI_INLINE Bytes upTo(ptrdiff_t offset, ptrdiff_t) const { return at(offset); }
};

template <int pixelBytes, int selectedBytes, class Source>
QORI_INLINE void selectBytes(uint8_t* dst, Source source, ptrdiff_t pixels) {
    alignas(32) static constexpr auto select = selectWithinPixel<pixelBytes>(selectedBytes);
    const ptrdiff_t bytes = (pixels - 1) * pixelBytes + selectedBytes;
    const Bytes s0 = load(select.data()), s1 = load(select.data() + 32), s2 = load(select.data() + 64);
    ptrdiff_t done = 0;
    for (; done <= bytes - Pattern::period; done += Pattern::period) {
        const Bytes a = source.at(done), b = source.at(done + 32), c = source.at(done + 64);
        store(dst + done, blend(load(dst + done), a, s0));
        store(dst + done + 32, blend(load(dst + done + 32), b, s1));
        store(dst + done + 64, blend(load(dst + done + 64), c, s2));
    }
    for (ptrdiff_t k = 0; done < bytes; done += 32, k += 32) {
        const Bytes kept = loadUpTo(dst + done, bytes - done);
        storeUpTo(dst + done, blend(kept, source.upTo(done, bytes - done), load(select.data() + k)), bytes - done);
    }
}

/// 32 pixels, one vector of mask. A mask without a hole or without a pixel skips the blend. Vectors without a selected
/// byte are not stored, and where what is selected comes in 4-byte words, nothing but selected words is.
template <int pixelBytes, int selectedBytes>
struct Masked {
    static constexpr bool wholePixel = selectedBytes == pixelBytes;
    static constexpr bool inWords = pixelBytes % 4 == 0 && selectedBytes % 4 == 0;

    template <class Source>
    static QORI_INLINE void group(uint8_t* dst, Source source, ptrdiff_t offset, const uint8_t* mask) {
        const Bytes kept = isZero(load(mask));
        const uint32_t keptBits = topBits(kept);
        if (keptBits == ~0u) return;
        if (wholePixel && keptBits == 0) {
            for (int k = 0; k < pixelBytes; ++k) store(dst + 32 * k, source.at(offset + 32 * k));
            return;
        }
        alignas(32) uint8_t keptBytes[32];
        if constexpr (pixelBytes > 1) store(keptBytes, kept);
        for (int k = 0; k < pixelBytes; ++k) {
            const Bytes keeps = keep(keptBytes, kept, k);
            if constexpr (inWords)
                storeWords(dst + 32 * k, source.at(offset + 32 * k), isZero(keeps));
            else if (topBits(keeps) != ~0u)
                store(dst + 32 * k, blend(source.at(offset + 32 * k), load(dst + 32 * k), keeps));
        }
    }

    /// The last pixels of a row, fewer than 32.
    template <class Source>
    static QORI_INLINE void tail(uint8_t* dst, Source source, ptrdiff_t offset, const uint8_t* mask, ptrdiff_t pixels) {
        // Zeros behind the mask keep what is behind the row.
        const Bytes kept = isZero(loadPartial(mask, pixels));
        alignas(32) uint8_t keptBytes[32];
        if constexpr (pixelBytes > 1) store(keptBytes, kept);
        const ptrdiff_t bytes = pixels * pixelBytes;
        for (int k = 0; 32 * k < bytes; ++k) {
            const ptrdiff_t rest = bytes - 32 * k;
            const Bytes keeps = keep(keptBytes, kept, k);
            if constexpr (inWords) {
                storeWords(dst + 32 * k, source.upTo(offset + 32 * k, rest), isZero(keeps));
            } else if (topBits(keeps) != ~0u) {
                const Bytes old = loadUpTo(dst + 32 * k, rest);
                storeUpTo(dst + 32 * k, blend(source.upTo(offset + 32 * k, rest), old, keeps), rest);
            }
        }
    }

    /// So few pixels that looking at each is cheaper.
    template <class Source>
    static QORI_INLINE void eachPixel(uint8_t* dst, Source source, const uint8_t* mask, int pixels) {
        for (int i = 0; i < pixels; ++i)
            if (mask[i] != 0) __builtin_memcpy(dst + i * pixelBytes, source.bytes(i * pixelBytes), selectedBytes);
    }

    /// The kept bytes of the group's vector k.
    static QORI_INLINE Bytes keep(const uint8_t* keptBytes, Bytes kept, int k) {
        if constexpr (pixelBytes == 1) return kept;
        static constexpr auto spread = maskWindows<pixelBytes>();
        const Window& window = spread[static_cast<size_t>(k)];
        const Bytes expanded = shuffleHalves(loadTwice(keptBytes + window.begin), load(window.index.at));
        if constexpr (wholePixel) return expanded;
        alignas(32) static constexpr auto alpha = [] {
            auto select = selectWithinPixel<pixelBytes>(selectedBytes);
            for (uint8_t& byte : select) byte = static_cast<uint8_t>(~byte);
            return select;
        }();
        return expanded | load(alpha.data());
    }
};

template <int pixelBytes, int selectedBytes, class Source>
QORI_INLINE void maskBytes(uint8_t* dst, Source source, const uint8_t* mask, ptrdiff_t pixels) {
    using Group = Masked<pixelBytes, selectedBytes>;
    if (pixels <= 4) return Group::eachPixel(dst, source, mask, static_cast<int>(pixels));
    ptrdiff_t done = 0;
    for (; done <= pixels - 32; done += 32)
        Group::group(dst + done * pixelBytes, source, done * pixelBytes, mask + done);
    if (done < pixels) Group::tail(dst + done * pixelBytes, source, done * pixelBytes, mask + done, pixels - done);
}

}  // namespace

template <int pixelBytes, int selectedBytes>
void selectRow(uint8_t* dst, const uint8_t* src, ptrdiff_t pixels) {
    selectBytes<pixelBytes, selectedBytes>(dst, RowSource{src}, pixels);
}

template <int pixelBytes, int selectedBytes>
void selectFillRow(uint8_t* dst, const Pattern& pattern, ptrdiff_t pixels) {
    selectBytes<pixelBytes, selectedBytes>(dst, PatternSource{pattern}, pixels);
}

template <int pixelBytes, int selectedBytes>
void maskedRow(uint8_t* dst, const uint8_t* src, const uint8_t* mask, ptrdiff_t pixels) {
    maskBytes<pixelBytes, selectedBytes>(dst, RowSource{src}, mask, pixels);
}

template <int pixelBytes, int selectedBytes>
void maskedFillRow(uint8_t* dst, const Pattern& pattern, const uint8_t* mask, ptrdiff_t pixels) {
    maskBytes<pixelBytes, selectedBytes>(dst, PatternSource{pattern}, mask, pixels);
}

// Four channels with alpha kept, one of three and one of four channels, in elements of 1, 2 and 4 bytes.
#define QORI_INSTANTIATE_SELECT(pixelBytes, selectedBytes)                                   \
    template void selectRow<pixelBytes, selectedBytes>(uint8_t*, const uint8_t*, ptrdiff_t); \
    template void selectFillRow<pixelBytes, selectedBytes>(uint8_t*, const Pattern&, ptrdiff_t)
QORI_INSTANTIATE_SELECT(4, 3);
QORI_INSTANTIATE_SELECT(8, 6);
QORI_INSTANTIATE_SELECT(16, 12);
QORI_INSTANTIATE_SELECT(3, 1);
QORI_INSTANTIATE_SELECT(6, 2);
QORI_INSTANTIATE_SELECT(12, 4);
QORI_INSTANTIATE_SELECT(4, 1);
QORI_INSTANTIATE_SELECT(8, 2);
QORI_INSTANTIATE_SELECT(16, 4);

#define QORI_INSTANTIATE_MASKED(pixelBytes, selectedBytes)                                                   \
    template void maskedRow<pixelBytes, selectedBytes>(uint8_t*, const uint8_t*, const uint8_t*, ptrdiff_t); \
    template void maskedFillRow<pixelBytes, selectedBytes>(uint8_t*, const Pattern&, const uint8_t*, ptrdiff_t)
QORI_INSTANTIATE_MASKED(1, 1);
QORI_INSTANTIATE_MASKED(2, 2);
QORI_INSTANTIATE_MASKED(3, 3);
QORI_INSTANTIATE_MASKED(4, 4);
QORI_INSTANTIATE_MASKED(6, 6);
QORI_INSTANTIATE_MASKED(8, 8);
QORI_INSTANTIATE_MASKED(12, 12);
QORI_INSTANTIATE_MASKED(16, 16);
QORI_INSTANTIATE_MASKED(4, 3);
QORI_INSTANTIATE_MASKED(8, 6);
QORI_INSTANTIATE_MASKED(16, 12);

}  // namespace qori::kernels
