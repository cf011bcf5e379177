// SPDX-License-Identifier: Apache-2.0
// Codes straight from the image, without rows of keys: several rows at a time. Bytes become keys when they are loaded
// and wait in registers for the rows below that see them: four rows of codes take six rows of keys, 4.5 loads and as
// many changes of sign a block instead of 9. Floats need no keys, and their comparisons load them.
//
// Codes are made of columns begin to end, at least a block, in whole blocks: the first at begin, then at multiples of a
// block, the last before end, over some of the one before it.
#pragma once
#include "patterns.h"

namespace qori::kernels {

/// Rows of codes made together.
inline constexpr int kPatternRows = 4;

namespace lbp {

/// makeBlock.operator()<isAligned>(x) for each block; with `streaming`, those at multiples of one are aligned.
template <bool streaming, class MakeBlock>
QORI_INLINE void forBlocksBetween(ptrdiff_t begin, ptrdiff_t end, MakeBlock makeBlock) {
    const ptrdiff_t last = end - kPatternBlock;
    for (ptrdiff_t x = begin;;) {
        if (streaming && x % kPatternBlock == 0)
            makeBlock.template operator()<true>(x);
        else
            makeBlock.template operator()<false>(x);
        if (x == last) return;
        x = (x & ~ptrdiff_t{kPatternBlock - 1}) + kPatternBlock;
        if (x > last) x = last;
    }
}

/// The keys of a row that a window of eight neighbours sees: to the left, in the middle, to the right.
struct KeyTriple {
    Vec<int8_t> at[3];

    template <int reach>
    QORI_INLINE static KeyTriple from(const uint8_t* p) {
        const auto keys = [=](ptrdiff_t dx) { return Vec<int8_t>{(load(p + dx) ^ splat<uint8_t>(128)).v}; };
        return {{keys(-reach), keys(0), keys(reach)}};
    }
};

template <int reach, int mode>
QORI_INLINE Bytes codesOf(const KeyTriple& above, const KeyTriple& row, const KeyTriple& below) {
    return joinBits<int8_t>([&]<int bit>() __attribute__((always_inline)) {
        constexpr Place place = placeOfBit(bit, 8, reach, mode);
        const KeyTriple& seen = place.dy < 0 ? above : place.dy > 0 ? below : row;
        return Bytes{isLess(seen.at[1 + place.dx / reach], row.at[1]).v};
    });
}

/// `made` rows of codes that are `reach` rows apart, as those they are made of.
template <int reach, int mode, bool streaming, int made>
QORI_NOINLINE void patternTile(const uint8_t* const* rowsAround, uint8_t* dst, ptrdiff_t step, ptrdiff_t begin,
                               ptrdiff_t end) {
    const uint8_t* rows[made + 2];  // stores of codes cannot alias this copy
    for (int i = 0; i < made + 2; ++i) rows[i] = rowsAround[i * reach];
    forBlocksBetween<streaming>(
        begin, end, [&]<bool isAligned>(ptrdiff_t x) __attribute__((always_inline)) {
            KeyTriple above = KeyTriple::from<reach>(rows[0] + x), row = KeyTriple::from<reach>(rows[1] + x);
#pragma GCC unroll 8
            for (int i = 0; i < made; ++i) {
                const KeyTriple below = KeyTriple::from<reach>(rows[i + 2] + x);
                storeAs<isAligned>(dst + i * reach * step + x, codesOf<reach, mode>(above, row, below));
                above = row;
                row = below;
            }
        });
}

}  // namespace lbp

/// `count` rows of codes, of bytes those of eight neighbours. rows: at column 0, from `reach` rows above the first one
/// to `reach` below the last; read from `reach` columns before begin to `reach` behind end. Streaming: dst and step are
/// multiples of 32 bytes.
template <int reach, int mode, bool streaming, class T, class D>
void patternRows(const T* const* rows, D* dst, ptrdiff_t step, int count, ptrdiff_t begin, ptrdiff_t end) {
    const auto rowOf = [=](int y) { return reinterpret_cast<D*>(reinterpret_cast<uint8_t*>(dst) + y * step); };
    if constexpr (std::is_floating_point_v<T>) {
        for (int y = 0; y < count; ++y)
            lbp::forBlocksBetween<streaming>(
                begin, end, [&, around = lbp::RowsAround<T, reach>(rows + y),
                             to = rowOf(y) ]<bool isAligned>(ptrdiff_t x) __attribute__((always_inline)) {
                    lbp::patternBlock<D, reach, mode, isAligned>(around, to + x, x, kPatternBlock);
                });
    } else {
        int y = 0;
        for (; y + kPatternRows * reach <= count; y += kPatternRows * reach)
            for (int first = y; first < y + reach; ++first)
                lbp::patternTile<reach, mode, streaming, kPatternRows>(rows + first, rowOf(first), step, begin, end);
        for (; y < count; ++y) lbp::patternTile<reach, mode, streaming, 1>(rows + y, rowOf(y), step, begin, end);
    }
}

/// A block of codes of a column: columns of keys, from `reach` to the left to `reach` to the right, at the first pixel.
template <class D, int reach, int mode, class Key>
void patternColumn(const Key* const* columns, D* dst) {
    lbp::patternBlock<D, reach, mode, false, true>(lbp::RowsAround<Key, reach>(columns), dst, 0, kPatternBlock);
}

}  // namespace qori::kernels
