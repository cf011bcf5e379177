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
    int32_t turn;

    Rows(const WarpSource& source, const WarpLine& line)
        : above(source.origin), below(source.origin + source.step), ahead(source.ahead), turn(line.turn) {}
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
    static constexpr int kPixels = 16, kPixelBytes = 1, kWord = 4;
    static constexpr bool kPreparesAhead = false;

    Rows rows;

    QORI_INLINE static __m256i join(__m256i low, __m256i high) {
        return _mm256_blend_epi16(low, _mm256_slli_epi32(high, 16), 0xAA);
    }

    struct Prepared {
        __m256i offsets[2], shifts[2], across, down;
    };

    template <class Blocks>
    QORI_INLINE void prepare(const Blocks& blocks, Prepared& to) const {
        const Block a = blocks.at(0), b = blocks.at(1);
        to.offsets[0] = a.offsets;
        to.offsets[1] = b.offsets;
        if constexpr (anywhere) {
            to.shifts[0] = a.shifts;
            to.shifts[1] = b.shifts;
        }
        to.across = acrossOf(join(a.x, b.x));
        to.down = downOf(join(a.y, b.y));
    }

    QORI_INLINE static __m256i pairs(const uint8_t* row, const Prepared& from) {
        const auto at = [&](int k) __attribute__((always_inline)) {
            const __m256i words = _mm256_i32gather_epi32(reinterpret_cast<const int*>(row), from.offsets[k], 1);
            return anywhere ? _mm256_srlv_epi32(words, from.shifts[k]) : words;
        };
        return join(at(0), at(1));
    }

    QORI_INLINE void make(const Prepared& from, uint8_t* dst, int n) const {
        if constexpr (!anywhere)
            prefetchAhead(rows.above + _mm_cvtsi128_si32(_mm256_castsi256_si128(from.offsets[0])), rows.ahead);
        const __m256i mixed = mix(pairs(rows.above, from), pairs(rows.below, from), from.across, from.down);
        constexpr char x = -1;
        const __m256i order = inBothBlocks(_mm_setr_epi8(0, 4, 8, 12, 2, 6, 10, 14, x, x, x, x, x, x, x, x));
        const Bytes pixels{_mm256_permute4x64_epi64(_mm256_shuffle_epi8(mixed, order), 0x08)};
        if (n == kPixels)
            storeFirst<kPixels>(dst, pixels);
        else
            storePartial(dst, pixels, n);
    }
};

/// Three or four channels: eight bytes hold two neighbours; with three, the last two are not used. Four pixels are in a
/// vector: 0, 1, 4, 5 and 2, 3, 6, 7.
template <int channels, bool anywhere>
struct Packed {
    static constexpr int kPixels = 8, kPixelBytes = channels, kWord = 8;
    static constexpr bool kPreparesAhead = true;

    Rows rows;

    struct Prepared {
        alignas(kVectorBytes) int32_t offsets[8], shifts[8];
        __m256i x, y;
    };

    template <class Blocks>
    QORI_INLINE void prepare(const Blocks& blocks, Prepared& to) const {
        const Block block = blocks.at(0);
        qori::store(to.offsets, Vec<int32_t>{block.offsets});
        if constexpr (anywhere) qori::store(to.shifts, Vec<int32_t>{block.shifts});
        to.x = acrossOf(block.x);
        to.y = downOf(block.y);
    }

    /// Blocks of 16 bytes, of which one half is taken, cost less than words that are gathered or put together.
    QORI_INLINE static __m256i readBlocks(const uint8_t* row, const int32_t* offsets) {
        const Bytes first = loadBlocks(row + offsets[0], row + offsets[4]);
        const Bytes second = loadBlocks(row + offsets[1] - kWord, row + offsets[5] - kWord);
        return _mm256_blend_epi32(first.v, second.v, 0xCC);
    }

    /// Pixels k, k + 1, k + 4 and k + 5.
    QORI_INLINE static __m256i gather(const uint8_t* row, const Prepared& from, int k) {
        const auto four = [=](const int32_t* p) __attribute__((always_inline)) {
            return _mm_unpacklo_epi64(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p + k)),
                                      _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p + k + 4)));
        };
        const auto* words = reinterpret_cast<const long long*>(row);
        const __m256i gathered = _mm256_i32gather_epi64(words, four(from.offsets), 1);
        return channels == 4 ? gathered : _mm256_srlv_epi64(gathered, _mm256_cvtepu32_epi64(four(from.shifts)));
    }

    /// Pixels k, k + 1, k + 4 and k + 5, as words.
    template <int k>
    QORI_INLINE __m256i four(const Prepared& from) const {
        const auto read = [&](const uint8_t* row) __attribute__((always_inline)) {
            return anywhere ? gather(row, from, k) : readBlocks(row, from.offsets + k);
        };
        constexpr char c = channels, f = c == 4 ? 7 : 3;  // the fourth of three is anything
        const __m256i pairs =
            inBothBlocks(_mm_setr_epi8(0, c, 1, c + 1, 2, c + 2, 3, f, 8, c + 8, 9, c + 9, 10, c + 10, 11, f + 8));
        constexpr char a = 4 * k, b = a + 1, d = a + 4, e = a + 5;
        const __m256i own = inBothBlocks(_mm_setr_epi8(a, b, a, b, a, b, a, b, d, e, d, e, d, e, d, e));
        return mix(_mm256_shuffle_epi8(read(rows.above), pairs), _mm256_shuffle_epi8(read(rows.below), pairs),
                   _mm256_shuffle_epi8(from.x, own), _mm256_shuffle_epi8(from.y, own));
    }

    QORI_INLINE void make(const Prepared& from, uint8_t* dst, int n) const {
        if constexpr (!anywhere) prefetchAhead(rows.above + from.offsets[rows.turn], rows.ahead);
        const __m256i first = four<0>(from);
        const Bytes pixels{_mm256_packus_epi16(first, four<2>(from))};
        if (n == kPixels)
            write(dst, pixels);
        else
            write(dst, pixels, n);
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
    const Way way{Rows(source, line)};
    if constexpr (reads == ByteReads::fixed)
        makeFixedBlocks(way, source, line, first, count, dst);
    else
        makeDoubleBlocks<anywhere>(way, source, line, box, first, count, dst);
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
