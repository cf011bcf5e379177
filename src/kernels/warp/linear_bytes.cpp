// SPDX-License-Identifier: Apache-2.0
#include "linear_bytes.h"

#include "fixed_places.h"

namespace qori::kernels {
namespace {

using namespace warp;

/// Rows of the source, and from where on the kernels prefetch.
struct Rows {
    const uint8_t *above, *below;
    ptrdiff_t ahead;

    explicit Rows(const WarpSource& source)
        : above(source.origin), below(source.origin + source.step), ahead(source.ahead) {}
};

/// Positions between pixels as words: across 2 f - 1, down f, in 2^-15.
QORI_INLINE __m256i acrossOf(__m256i fractions) { return _mm256_xor_si256(fractions, _mm256_set1_epi16(INT16_MIN)); }
QORI_INLINE __m256i downOf(__m256i fractions) { return _mm256_srli_epi16(fractions, 1); }

/// Neighbours in a word's two bytes, mixed: in 2^-7.
QORI_INLINE __m256i mixAcross(__m256i pairs, __m256i x) {
    const __m256i sum = _mm256_maddubs_epi16(pairs, _mm256_set1_epi16(0x4040));
    const __m256i difference = _mm256_maddubs_epi16(pairs, _mm256_set1_epi16(0x40C0));  // the second less the first
    return _mm256_add_epi16(sum, _mm256_mulhrs_epi16(difference, x));
}

/// Words up to 255, rounded.
QORI_INLINE __m256i mix(__m256i above, __m256i below, __m256i x, __m256i y) {
    const __m256i top = mixAcross(above, x), bottom = mixAcross(below, x);
    const __m256i sum = _mm256_add_epi16(top, _mm256_mulhrs_epi16(_mm256_sub_epi16(bottom, top), y));
    return _mm256_mulhrs_epi16(sum, _mm256_set1_epi16(1 << 8));
}

QORI_INLINE __m256i inBothBlocks(__m128i table) { return _mm256_broadcastsi128_si256(table); }

/// One channel: gathered words hold two neighbours and two bytes that are not used. Eight of them and eight more are
/// the low and the high words of one vector.
template <bool anywhere>
struct Gray {
    static constexpr int kPixels = 16, kWord = 4;

    QORI_INLINE static __m256i join(__m256i low, __m256i high) {
        return _mm256_blend_epi16(low, _mm256_slli_epi32(high, 16), 0xAA);
    }

    QORI_INLINE static __m256i pairs(const uint8_t* row, const Block& a, const Block& b) {
        const auto at = [=](const Block& block) __attribute__((always_inline)) {
            const __m256i words = _mm256_i32gather_epi32(reinterpret_cast<const int*>(row), block.offsets, 1);
            return anywhere ? _mm256_srlv_epi32(words, block.shifts) : words;
        };
        return join(at(a), at(b));
    }

    template <class Blocks>
    QORI_INLINE static Bytes make(const Rows& rows, const Blocks& blocks) {
        const Block a = blocks.at(0), b = blocks.at(1);
        if constexpr (!anywhere)
            prefetchAhead(rows.above + _mm_cvtsi128_si32(_mm256_castsi256_si128(a.offsets)), rows.ahead);
        const __m256i across = acrossOf(join(a.x, b.x)), down = downOf(join(a.y, b.y));
        const __m256i mixed = mix(pairs(rows.above, a, b), pairs(rows.below, a, b), across, down);
        constexpr char x = -1;
        const __m256i order = inBothBlocks(_mm_setr_epi8(0, 4, 8, 12, 2, 6, 10, 14, x, x, x, x, x, x, x, x));
        return {_mm256_permute4x64_epi64(_mm256_shuffle_epi8(mixed, order), 0x08)};
    }

    QORI_INLINE static void write(uint8_t* dst, Bytes pixels) { storeFirst<kPixels>(dst, pixels); }
    QORI_INLINE static void write(uint8_t* dst, Bytes pixels, int n) { storePartial(dst, pixels, n); }
};

/// Three or four channels: eight bytes hold two neighbours; with three, the last two are not used. Four pixels are in a
/// vector: 0, 1, 4, 5 and 2, 3, 6, 7.
template <int channels, bool anywhere>
struct Packed {
    static constexpr int kPixels = 8, kWord = 8;

    /// Blocks of 16 bytes, of which one half is taken, cost less than words that are gathered or put together.
    QORI_INLINE static __m256i readBlocks(const uint8_t* row, const int32_t* offsets) {
        const Bytes first = loadBlocks(row + offsets[0], row + offsets[4]);
        const Bytes second = loadBlocks(row + offsets[1] - kWord, row + offsets[5] - kWord);
        return _mm256_blend_epi32(first.v, second.v, 0xCC);
    }

    QORI_INLINE static __m256i gather(const uint8_t* row, __m128i offsets, __m128i shifts) {
        const __m256i words = _mm256_i32gather_epi64(reinterpret_cast<const long long*>(row), offsets, 1);
        return channels == 4 ? words : _mm256_srlv_epi64(words, _mm256_cvtepu32_epi64(shifts));
    }

    /// `fractions` says which words of x and y belong to the pixels.
    QORI_INLINE static __m256i mixFour(__m256i above, __m256i below, __m256i x, __m256i y, __m256i fractions) {
        constexpr char c = channels, f = c == 4 ? 7 : 3;  // the fourth of three is anything
        const __m256i pairs =
            inBothBlocks(_mm_setr_epi8(0, c, 1, c + 1, 2, c + 2, 3, f, 8, c + 8, 9, c + 9, 10, c + 10, 11, f + 8));
        return mix(_mm256_shuffle_epi8(above, pairs), _mm256_shuffle_epi8(below, pairs),
                   _mm256_shuffle_epi8(x, fractions), _mm256_shuffle_epi8(y, fractions));
    }

    /// Four bytes a pixel.
    template <class Blocks>
    QORI_INLINE static Bytes make(const Rows& rows, const Blocks& blocks) {
        const Block block = blocks.at(0);
        const __m256i x = acrossOf(block.x), y = downOf(block.y);
        const __m256i firstTwo = inBothBlocks(_mm_setr_epi8(0, 1, 0, 1, 0, 1, 0, 1, 4, 5, 4, 5, 4, 5, 4, 5));
        const __m256i lastTwo = inBothBlocks(_mm_setr_epi8(8, 9, 8, 9, 8, 9, 8, 9, 12, 13, 12, 13, 12, 13, 12, 13));
        if constexpr (anywhere) {
            const __m256i at = _mm256_permute4x64_epi64(block.offsets, 0xD8),
                          by = _mm256_permute4x64_epi64(block.shifts, 0xD8);
            const auto four = [&](__m128i offsets, __m128i shifts, __m256i fractions) __attribute__((always_inline)) {
                return mixFour(gather(rows.above, offsets, shifts), gather(rows.below, offsets, shifts), x, y,
                               fractions);
            };
            const __m256i first = four(_mm256_castsi256_si128(at), _mm256_castsi256_si128(by), firstTwo);
            const __m256i second = four(_mm256_extracti128_si256(at, 1), _mm256_extracti128_si256(by, 1), lastTwo);
            return {_mm256_packus_epi16(first, second)};
        } else {
            alignas(kVectorBytes) int32_t at[8];
            qori::store(at, Vec<int32_t>{block.offsets});
            __asm__("" : "+m"(at));  // to be loaded: moves out of the vector would take the shuffles' ports
            prefetchAhead(rows.above + at[0], rows.ahead);
            const auto four = [&](const int32_t* offsets, __m256i fractions) __attribute__((always_inline)) {
                return mixFour(readBlocks(rows.above, offsets), readBlocks(rows.below, offsets), x, y, fractions);
            };
            const __m256i first = four(at, firstTwo);
            return {_mm256_packus_epi16(first, four(at + 2, lastTwo))};
        }
    }

    /// Of three bytes a pixel, those of the last four pixels are put at the end of their block: one store writes them
    /// and four bytes before, which two more write again.
    QORI_INLINE static void write(uint8_t* dst, Bytes pixels) {
        if constexpr (channels == 4) return qori::store(dst, pixels);
        constexpr char x = -1;
        const __m256i three = _mm256_setr_epi8(0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, x, x, x, x,  //
                                               x, x, x, x, 0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14);
        const __m256i packed = _mm256_shuffle_epi8(pixels.v, three);
        const __m128i first = _mm256_castsi256_si128(packed);
        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + 8), _mm256_extracti128_si256(packed, 1));
        _mm_storel_epi64(reinterpret_cast<__m128i*>(dst), first);
        qori::detail::storeWord(dst + 8, _mm_extract_epi32(first, 2));
    }

    QORI_INLINE static void write(uint8_t* dst, Bytes pixels, int n) {
        if constexpr (channels == 4) return storePartial(dst, pixels, n * channels);
        const __m256i three = inBothBlocks(_mm_setr_epi8(0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, -1, -1, -1, -1));
        const __m256i packed = _mm256_permutevar8x32_epi32(_mm256_shuffle_epi8(pixels.v, three),
                                                           _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 7, 7));
        storePartial(dst, Bytes{packed}, n * channels);
    }
};

}  // namespace

template <int channels, ByteReads reads>
void linearBytes(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                 uint8_t* dst) {
    constexpr bool anywhere = reads == ByteReads::anywhere;
    using Way = std::conditional_t<channels == 1, Gray<anywhere>, Packed<channels, anywhere>>;
    constexpr int kPixels = Way::kPixels;
    const Rows rows(source);
    const auto body = [&](const auto& blocks, int n, int32_t at) __attribute__((always_inline)) {
        const Bytes pixels = Way::make(rows, blocks);
        if (n == kPixels)
            Way::write(dst + at * channels, pixels);
        else
            Way::write(dst + at * channels, pixels, n);
    };
    if constexpr (reads == ByteReads::fixed)
        forFixedBlocks<kPixels, channels>(source, line, first, count, body);
    else
        forDoubleBlocks<kPixels, channels, anywhere, Way::kWord>(source, line, box, first, count, body);
}

#define QORI_LINEAR_BYTES(n, reads)                                                                             \
    template void linearBytes<n, ByteReads::reads>(const WarpSource&, const WarpLine&, const WarpBox&, int32_t, \
                                                   int32_t, uint8_t*);
#define QORI_LINEAR_CHANNELS(n) \
    QORI_LINEAR_BYTES(n, fixed) \
    QORI_LINEAR_BYTES(n, inside) QORI_LINEAR_BYTES(n, anywhere)
QORI_LINEAR_CHANNELS(1)
QORI_LINEAR_CHANNELS(3)
QORI_LINEAR_CHANNELS(4)
#undef QORI_LINEAR_CHANNELS
#undef QORI_LINEAR_BYTES

}  // namespace qori::kernels
