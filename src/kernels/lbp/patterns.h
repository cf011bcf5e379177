// SPDX-License-Identifier: Apache-2.0
// Local binary patterns: a bit for each neighbour that is at least as large as the pixel itself.
//
// Rows come as keys: integers moved so that signed comparisons, the only ones there are, put them in order; floats as
// they are. Keys may be read, though they mean nothing, up to a block beyond the row.
//
// A block's truths are packed to a byte for each of 32 pixels, 0 or 255, in whatever order packing leaves them; the
// order is put right once, at the end. Bits are joined in two ways, to keep all ports of the processor busy: the upper
// ones by averages, which shift a sum to the right and enter a truth on its left, the lower ones by additions.
#pragma once
#include "kernels/byte_tables.h"
#include "kernels/copy_rows.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// Pixels made at a time.
inline constexpr int kPatternBlock = kVectorBytes;

namespace lbp {

template <class T>
struct KeyOf {
    using type = T;
};
template <>
struct KeyOf<uint8_t> {
    using type = int8_t;
};
template <>
struct KeyOf<uint16_t> {
    using type = int16_t;
};

template <class Key>
constexpr bool isFloat = std::is_floating_point_v<Key>;

/// A block of keys.
template <class Key>
struct KeyBlock {
    static constexpr int vectors = static_cast<int>(sizeof(Key));
    Vec<Key> part[vectors];

    QORI_INLINE explicit KeyBlock(const Key* p) {
        for (int k = 0; k < vectors; ++k) part[k] = load(p + k * Vec<Key>::lanes);
    }
};

/// The lower words of a's lanes and the upper words of b's: of truths, the words of both. Packing keeps an order that
/// is not needed yet, and runs on one port of the processor where this runs on three.
QORI_INLINE __m256i alternate(__m256i a, __m256i b) { return _mm256_blend_epi16(a, b, 0xAA); }

/// A byte for each pixel: -1 where the neighbour is smaller (integers), or where it is not smaller (floats, whose
/// comparisons with NaN are all false).
template <class Key>
QORI_INLINE Bytes truths(const KeyBlock<Key>& centre, const KeyBlock<Key>& neighbour) {
    __m256i truth[KeyBlock<Key>::vectors];
    for (int k = 0; k < KeyBlock<Key>::vectors; ++k) {
        if constexpr (isFloat<Key>)
            truth[k] = isAtMost(centre.part[k], neighbour.part[k]).v;
        else
            truth[k] = isLess(neighbour.part[k], centre.part[k]).v;
    }
    if constexpr (sizeof(Key) == 1)
        return {truth[0]};
    else if constexpr (sizeof(Key) == 2)
        return {_mm256_packs_epi16(truth[0], truth[1])};
    else
        return {_mm256_packs_epi16(alternate(truth[0], truth[1]), alternate(truth[2], truth[3]))};
}

/// Bits from this one on enter by averages.
template <class Key>
constexpr int kFirstAveraged = isFloat<Key> ? 3 : 2;

/// Bits 0 to 7 as a code, of pixels in order. truthOf.operator()<bit>() makes the truths of a bit. An average is
/// (a + b + 1) / 2: of an even sum and 0 its half, of an even sum and 255 its half and 128; the sum before the last one
/// is even still. Truths of integers are those of bits that are not set, and the complement of them all costs nothing:
/// what the first average has beside its bit is 1 at the end, and 0 - 1 - bits is 255 - bits.
template <class Key, class TruthOf>
QORI_INLINE Bytes joinBits(TruthOf truthOf) {
    constexpr int first = kFirstAveraged<Key>;
    const auto average = [](Bytes a, Bytes b) { return Bytes{_mm256_avg_epu8(a.v, b.v)}; };
    const Bytes begin = truthOf.template operator()<first>();
    Bytes upper = isFloat<Key> ? begin & splat<uint8_t>(128) : average(begin, splat<uint8_t>(2 << (7 - first)));
    if constexpr (first == 2) upper = average(upper, truthOf.template operator()<3>());
    upper = average(upper, truthOf.template operator()<4>());
    upper = average(upper, truthOf.template operator()<5>());
    upper = average(upper, truthOf.template operator()<6>());
    upper = average(upper, truthOf.template operator()<7>());
    Bytes lower = truthOf.template operator()<1>();  // negative: a truth counts as -1
    if constexpr (first == 3) {
        const Bytes third = truthOf.template operator()<2>();
        lower = third + third + lower;
    }
    lower = lower + lower + truthOf.template operator()<0>();
    const Bytes codes = isFloat<Key> ? upper - lower : lower - upper;
    if constexpr (sizeof(Key) == 1)
        return codes;
    else if constexpr (sizeof(Key) == 2)
        return {_mm256_permute4x64_epi64(codes.v, 0xD8)};
    else {  // in either half four pixels of each vector, those of the first two and of the last two in turn
        static constexpr ByteTable apart = bothHalves([](int i) { return i / 8 * 8 + i % 4 * 2 + i / 4 % 2; });
        return {_mm256_permutevar8x32_epi32(shuffleInBlocks(codes, load(apart.at)).v,
                                            _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))};
    }
}

struct Place {
    int dx, dy;
};

/// Position i of `count` on the square ring around a pixel, clockwise from the top-left corner.
constexpr Place onRing(int i, int count, int reach) {
    const int side = 2 * reach, at = i * 4 * side / count, along = at % side;
    switch (at / side) {
        case 0: return {-reach + along, -reach};
        case 1: return {reach, -reach + along};
        case 2: return {reach - along, reach};
        default: return {-reach, reach - along};
    }
}

/// The neighbour of a bit. Modes 0 and 1 begin at the top-left corner, 2 and 3 to the left; 1 and 3 turn clockwise.
constexpr Place placeOfBit(int bit, int count, int reach, int mode) {
    const int first = mode >= 2 ? count * 7 / 8 : 0;
    return onRing((first + (mode % 2 == 1 ? bit : count - bit)) % count, count, reach);
}

/// The rows that a window sees, or its columns. Stores of codes cannot alias this copy.
template <class Key, int reach>
struct RowsAround {
    const Key* at[2 * reach + 1];

    QORI_INLINE explicit RowsAround(const Key* const* rows) {
        for (int i = 0; i < 2 * reach + 1; ++i) at[i] = rows[i];
    }
};

/// Eight bits of the code, from firstBit on.
template <int count, int reach, int mode, int firstBit, bool byColumns, class Key>
QORI_INLINE Bytes eightBits(const RowsAround<Key, reach>& rows, const KeyBlock<Key>& centre, ptrdiff_t x) {
    return joinBits<Key>([&]<int bit>() __attribute__((always_inline)) {
        constexpr Place place = placeOfBit(firstBit + bit, count, reach, mode);
        constexpr int row = byColumns ? place.dx : place.dy, column = byColumns ? place.dy : place.dx;
        return truths(centre, KeyBlock<Key>(rows.at[reach + row] + x + column));
    });
}

/// A block of codes, or the first n.
template <bool streaming>
QORI_INLINE void storeCodes(uint8_t* dst, Bytes codes, ptrdiff_t n) {
    if (n >= kPatternBlock)
        storeAs<streaming>(dst, codes);
    else
        storePartial(dst, codes, n);
}

template <bool streaming>
QORI_INLINE void storeCodes(uint16_t* dst, Bytes low, Bytes high, ptrdiff_t n) {
    constexpr int half = Vec<uint16_t>::lanes;
    const __m256i even = _mm256_unpacklo_epi8(low.v, high.v), odd = _mm256_unpackhi_epi8(low.v, high.v);
    const Vec<uint16_t> first{_mm256_permute2x128_si256(even, odd, 0x20)};
    const Vec<uint16_t> second{_mm256_permute2x128_si256(even, odd, 0x31)};
    if (n >= kPatternBlock) {
        storeAs<streaming>(dst, first);
        storeAs<streaming>(dst + half, second);
    } else {
        storeUpTo(dst, first, n);
        storeUpTo(dst + half, second, n - half);
    }
}

/// A block of codes, or its first n, of `count` neighbours on the square ring of radius `reach`, 8 or 16 of them.
template <class D, int reach, int mode, bool streaming, bool byColumns = false, class Key>
QORI_INLINE void patternBlock(const RowsAround<Key, reach>& rows, D* dst, ptrdiff_t x, ptrdiff_t n) {
    constexpr int count = 8 * static_cast<int>(sizeof(D));
    const KeyBlock<Key> centre(rows.at[reach] + x);
    const Bytes low = eightBits<count, reach, mode, 0, byColumns>(rows, centre, x);
    if constexpr (count == 8)
        storeCodes<streaming>(dst, low, n);
    else
        storeCodes<streaming>(dst, low, eightBits<count, reach, mode, 8, byColumns>(rows, centre, x), n);
}

}  // namespace lbp

template <class T>
using PatternKey = typename lbp::KeyOf<T>::type;

template <class T>
PatternKey<T> patternKey(T value) {
    if constexpr (std::is_floating_point_v<T>)
        return value;
    else
        return static_cast<PatternKey<T>>(value ^ (T{1} << (8 * sizeof(T) - 1)));
}

template <class T>
QORI_INLINE void patternKeys(const T* src, PatternKey<T>* keys, ptrdiff_t n) {
    if constexpr (std::is_floating_point_v<T>) {
        copyRow(reinterpret_cast<uint8_t*>(keys), reinterpret_cast<const uint8_t*>(src),
                n * static_cast<ptrdiff_t>(sizeof(T)));
    } else {
        constexpr ptrdiff_t lanes = Vec<T>::lanes;
        const Vec<T> least = splat(static_cast<T>(T{1} << (8 * sizeof(T) - 1)));
        const auto keysOf = [&](Vec<T> a) { return Vec<PatternKey<T>>{(a ^ least).v}; };
        ptrdiff_t i = 0;
        for (; i + lanes <= n; i += lanes) store(keys + i, keysOf(load(src + i)));
        if (i < n) storePartial(keys + i, keysOf(loadPartial(src + i, n - i)), n - i);
    }
}

/// A row of pixels that becomes keys while codes are made of the rows before it, a block at a time: loads wait for
/// memory and codes for arithmetic, so that either hides behind the other. Rows of strips are too short for the
/// processor to see them coming: the row behind is fetched in passing.
template <class T>
struct PatternRowAhead {
    const T* src;
    PatternKey<T>* keys;
    ptrdiff_t toNext;  ///< Bytes from src to the row behind it, or 0.

    QORI_INLINE void enterBlock(ptrdiff_t x) const {
        const auto* const next = reinterpret_cast<const char*>(src + x) + toNext;
        _mm_prefetch(next, _MM_HINT_T0);
        patternKeys(src + x, keys + x, kPatternBlock);
    }
};

namespace lbp {

/// makeBlock(x, n) for each block and what is left of the row; whole blocks of the row ahead enter.
template <class Ahead, class MakeBlock>
QORI_INLINE void forEachBlock(ptrdiff_t width, const Ahead& ahead, MakeBlock makeBlock) {
    ptrdiff_t x = 0;
    for (; x + kPatternBlock <= width; x += kPatternBlock) {
        makeBlock(x, ptrdiff_t{kPatternBlock});
        ahead.enterBlock(x);
    }
    if (x < width) makeBlock(x, width - x);
}

}  // namespace lbp

/// One row of codes. rows: at the first pixel, from `reach` above to `reach` below. Streaming: dst is 32-byte aligned.
template <class D, int reach, int mode, bool streaming, class T>
void patternRow(const PatternKey<T>* const* rowsAround, D* dst, ptrdiff_t width, const PatternRowAhead<T>& rowAhead) {
    const lbp::RowsAround<PatternKey<T>, reach> rows(rowsAround);
    const PatternRowAhead<T> ahead = rowAhead;  // which stores might change
    lbp::forEachBlock(
        width, ahead, [&](ptrdiff_t x, ptrdiff_t n) __attribute__((always_inline)) {
            lbp::patternBlock<D, reach, mode, streaming>(rows, dst + x, x, n);
        });
}

/// Sums of three rows of keys, from one pixel to the left of the row to one beyond it, rounded up to blocks: within
/// 3 * 2^15 of zero.
template <class Key>
void patternColumnSums(const Key* const* rows, Wider<Key>* sums, ptrdiff_t width) {
    constexpr ptrdiff_t lanes = Vec<Wider<Key>>::lanes;
    for (ptrdiff_t x = -1; x <= width; x += lanes)
        store(sums + x, loadWidened(rows[0] + x) + loadWidened(rows[1] + x) + loadWidened(rows[2] + x));
}

/// Codes of the 3 x 3 neighbours as mode 0 has them, but for the left and the right one: their bits are set where the
/// sum of that column is at least the pixel's own.
template <bool streaming, class Key, class Ahead>
void correctedPatternRow(const Key* const* rows, const Wider<Key>* sums, uint8_t* dst, ptrdiff_t width, Ahead ahead) {
    using Sum = Wider<Key>;
    lbp::forEachBlock(
        width, ahead, [&](ptrdiff_t x, ptrdiff_t n) __attribute__((always_inline)) {
            const lbp::KeyBlock<Key> centre(rows[1] + x);
            const auto bySums = [&](ptrdiff_t dx) {
                constexpr int lanes = Vec<Sum>::lanes;
                const auto truth = [&](int k) {
                    const Sum* const at = sums + x + k * lanes;
                    return isLess(load(at + dx), load(at)).v;
                };
                constexpr int inOrder = 0xD8;
                if constexpr (sizeof(Key) == 1)
                    return Bytes{_mm256_permute4x64_epi64(_mm256_packs_epi16(truth(0), truth(1)), inOrder)};
                const __m256i first = _mm256_permute4x64_epi64(_mm256_packs_epi32(truth(0), truth(1)), inOrder);
                const __m256i second = _mm256_permute4x64_epi64(_mm256_packs_epi32(truth(2), truth(3)), inOrder);
                return Bytes{_mm256_packs_epi16(first, second)};
            };
            const Bytes codes = lbp::joinBits<Key>([&]<int bit>() __attribute__((always_inline)) {
                constexpr lbp::Place place = lbp::placeOfBit(bit, 8, 1, 0);
                if constexpr (place.dy == 0)
                    return bySums(place.dx);
                else
                    return lbp::truths(centre, lbp::KeyBlock<Key>(rows[1 + place.dy] + x + place.dx));
            });
            lbp::storeCodes<streaming>(dst + x, codes, n);
        });
}

}  // namespace qori::kernels
