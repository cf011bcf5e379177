// SPDX-License-Identifier: Apache-2.0
#include "select_rows.h"

#include "kernels/byte_tables.h"
#include "kernels/simd.h"

namespace qori::kernels {
namespace {

/// What replaces the selected bytes: another row, or a pixel repeated with a period of 96 bytes.
struct RowSource {
    const uint8_t* row;

    QORI_INLINE const uint8_t* bytes() const { return row; }
    QORI_INLINE Bytes at(ptrdiff_t offset) const { return load(row + offset); }
    QORI_INLINE Bytes upTo(ptrdiff_t offset, ptrdiff_t bytes) const { return loadUpTo(row + offset, bytes); }
};

struct PatternSource {
    const Pattern& pattern;

    QORI_INLINE const uint8_t* bytes() const { return pattern.bytes; }
    QORI_INLINE Bytes at(ptrdiff_t offset) const { return load(pattern.bytes + offset % Pattern::period); }
    QORI_INLINE Bytes upTo(ptrdiff_t offset, ptrdiff_t) const { return at(offset); }
};

template <int pixelBytes, int selectedBytes, class Source>
QORI_INLINE void selectBytes(uint8_t* dst, Source source, ptrdiff_t pixels) {
    alignas(kVectorBytes) static constexpr auto select = selectWithinPixel<pixelBytes>(selectedBytes);
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
        for (int k = 0; k < pixelBytes; ++k) {
            if constexpr (inWords) {
                storeWords(dst + 32 * k, source.at(offset + 32 * k), selectedWords(isZero(kept), k));
            } else {
                const Bytes bytes = keptBytes(kept, k);
                if (pixelBytes > 1 && topBits(bytes) == ~0u) continue;
                store(dst + 32 * k, blend(source.at(offset + 32 * k), load(dst + 32 * k), bytes));
            }
        }
    }

    /// The last pixels of a row, fewer than 32.
    template <class Source>
    static QORI_INLINE void tail(uint8_t* dst, Source source, ptrdiff_t offset, const uint8_t* mask, ptrdiff_t pixels) {
        const Bytes kept = isZero(loadPartial(mask, pixels));
        if (topBits(kept) == ~0u) return;
        const ptrdiff_t count = pixels * pixelBytes;
        if (count <= 32) return storeRest(dst, dst, source, offset, kept, 0, count);
        for (int k = 0; 32 * k < count; ++k) {
            uint8_t* const at = dst + 32 * k;
            // Whether a few pixels hold a selected one is hard to predict: the store is led elsewhere, not jumped.
            uint8_t nowhere[32];
            uint8_t* const to = inWords || topBits(keptBytes(kept, k)) != ~0u ? at : nowhere;
            storeRest(to, at, source, offset + 32 * k, kept, k, count - 32 * k);
        }
    }

    /// Up to `rest` bytes of the group's vector k, which lies at dst.
    template <class Source>
    static QORI_INLINE void storeRest(uint8_t* to, const uint8_t* dst, Source source, ptrdiff_t offset, Bytes kept,
                                      int k, ptrdiff_t rest) {
        const Bytes value = source.upTo(offset, rest);
        if constexpr (inWords)
            storeWords(to, value, selectedWords(isZero(kept), k));  // none behind the row
        else
            storeUpTo(to, blend(value, loadUpTo(dst, rest), keptBytes(kept, k)), rest);
    }

    template <class Source>
    static QORI_INLINE void onePixel(uint8_t* dst, Source source, const uint8_t* mask) {
        if (*mask == 0) return;
        uint8_t pixel[selectedBytes];  // images may overlap where the caller does not mind what comes out
        __builtin_memcpy(pixel, source.bytes(), selectedBytes);
        __builtin_memcpy(dst, pixel, selectedBytes);
    }

    /// The flags of the group's pixels at each byte of its vector k.
    static QORI_INLINE Bytes spread(Bytes flags, int k) {
        if constexpr (pixelBytes == 1) return flags;
        static constexpr auto windows = maskWindows<pixelBytes>();
        const Window& window = windows[static_cast<size_t>(k)];
        const __m256i words = _mm256_load_si256(reinterpret_cast<const __m256i*>(window.words));
        return shuffleInBlocks({_mm256_permutevar8x32_epi32(flags.v, words)}, load(window.index.at));
    }

    static QORI_INLINE Bytes selectedWords(Bytes selected, int k) {
        if constexpr (wholePixel) return spread(selected, k);
        alignas(kVectorBytes) static constexpr auto colour = selectWithinPixel<pixelBytes>(selectedBytes);
        return spread(selected, k) & load(colour.data());
    }

    static QORI_INLINE Bytes keptBytes(Bytes kept, int k) {
        if constexpr (wholePixel) return spread(kept, k);
        alignas(kVectorBytes) static constexpr auto alpha = [] {
            auto select = selectWithinPixel<pixelBytes>(selectedBytes);
            for (uint8_t& byte : select) byte = static_cast<uint8_t>(~byte);
            return select;
        }();
        return spread(kept, k) | load(alpha.data());
    }
};

template <int pixelBytes, int selectedBytes, class Source>
QORI_INLINE void maskBytes(uint8_t* dst, Source source, const uint8_t* mask, ptrdiff_t pixels) {
    using Group = Masked<pixelBytes, selectedBytes>;
    if (pixels == 1) return Group::onePixel(dst, source, mask);
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
