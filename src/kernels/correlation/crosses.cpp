// SPDX-License-Identifier: Apache-2.0
#include "kernels/correlation/crosses.h"

namespace qori::kernels::correlation {

namespace {

QORI_INLINE Vec<Pair> multiplyAdd(Vec<Pair> a, Vec<Pair> b, Vec<Pair> sum) {
    return {_mm256_add_epi32(sum.v, _mm256_madd_epi16(a.v, b.v))};
}
QORI_INLINE Vec<double> multiplyAdd(Vec<double> a, Vec<double> b, Vec<double> sum) {
    return {_mm256_fmadd_pd(a.v, b.v, sum.v)};
}

template <int rows, class Cell>
QORI_NOINLINE void addToRows(Cell* sums, ptrdiff_t sumPitch, const Cell* cells, const Cell* taps, ptrdiff_t tapPitch,
                             ptrdiff_t tapCells, ptrdiff_t width) {
    constexpr int lanes = Vec<Cell>::lanes;
    for (ptrdiff_t x = 0; x < width; x += kBlockCells<Cell>) {
        Vec<Cell> low[rows], high[rows];
        for (int k = 0; k < rows; ++k) {
            low[k] = load(sums + k * sumPitch + x);
            high[k] = load(sums + k * sumPitch + x + lanes);
        }
        const Cell* from = cells + x;
        for (ptrdiff_t i = 0; i < tapCells; ++i, from += kTapElements<Cell>) {
            Vec<Cell> left = load(from), right = load(from + lanes);
            loadOnce(left.v);
            loadOnce(right.v);
            for (int k = 0; k < rows; ++k) {
                const Vec<Cell> tap = splat(taps[i - k * tapPitch]);
                low[k] = multiplyAdd(left, tap, low[k]);
                high[k] = multiplyAdd(right, tap, high[k]);
            }
        }
        for (int k = 0; k < rows; ++k) {
            store(sums + k * sumPitch + x, low[k]);
            store(sums + k * sumPitch + x + lanes, high[k]);
        }
    }
}

}  // namespace

template <class Cell>
void addCrosses(Cell* sums, ptrdiff_t sumPitch, int rows, const Cell* cells, const Cell* taps, ptrdiff_t tapPitch,
                ptrdiff_t tapCells, ptrdiff_t width) {
    switch (rows) {
        case 1: return addToRows<1>(sums, sumPitch, cells, taps, tapPitch, tapCells, width);
        case 2: return addToRows<2>(sums, sumPitch, cells, taps, tapPitch, tapCells, width);
        default:
            if constexpr (kCrossRows == 4) {
                if (rows == 3) return addToRows<3>(sums, sumPitch, cells, taps, tapPitch, tapCells, width);
                addToRows<4>(sums, sumPitch, cells, taps, tapPitch, tapCells, width);
            }
    }
}

template void addCrosses<Pair>(Pair*, ptrdiff_t, int, const Pair*, const Pair*, ptrdiff_t, ptrdiff_t, ptrdiff_t);
template void addCrosses<double>(double*, ptrdiff_t, int, const double*, const double*, ptrdiff_t, ptrdiff_t,
                                 ptrdiff_t);

}  // namespace qori::kernels::correlation
