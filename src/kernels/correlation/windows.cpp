// SPDX-License-Identifier: Apache-2.0
#include "kernels/correlation/windows.h"

namespace qori::kernels::correlation {

namespace {

QORI_INLINE Vec<Pair> valueOf(Vec<Pair> cell) { return {_mm256_srai_epi32(_mm256_slli_epi32(cell.v, 16), 16)}; }
QORI_INLINE Vec<Pair> squareOf(Vec<Pair> cell) {
    const __m256i alone = _mm256_and_si256(cell.v, _mm256_set1_epi32(0xFFFF));
    return {_mm256_madd_epi16(alone, alone)};
}
QORI_INLINE Vec<double> valueOf(Vec<double> cell) { return cell; }
QORI_INLINE Vec<double> squareOf(Vec<double> cell) { return cell * cell; }

template <class Cell, class Use>
QORI_INLINE void forVectorsOf(ptrdiff_t n, Use use) {
    for (ptrdiff_t x = 0; x < n; x += Vec<Cell>::lanes) use(x);
}

}  // namespace

template <class Cell>
void addRow(const Cell* cells, Sums<Cell> in, Sums<Cell> out, ptrdiff_t n) {
    const bool isFirst = in.squares == nullptr;
    forVectorsOf<Cell>(n, [=](ptrdiff_t x) {
        const Vec<Cell> cell = load(cells + x);
        if (out.values != nullptr) {
            const Vec<Cell> value = valueOf(cell);
            store(out.values + x, isFirst ? value : load(in.values + x) + value);
        }
        const Vec<Cell> square = squareOf(cell);
        store(out.squares + x, isFirst ? square : load(in.squares + x) + square);
    });
}

template <class Cell>
void slideRow(const Cell* entering, const Cell* leaving, Sums<Cell> sums, ptrdiff_t n) {
    forVectorsOf<Cell>(n, [=](ptrdiff_t x) {
        const Vec<Cell> in = load(entering + x), out = load(leaving + x);
        if (sums.values != nullptr) store(sums.values + x, load(sums.values + x) + (valueOf(in) - valueOf(out)));
        store(sums.squares + x, load(sums.squares + x) + (squareOf(in) - squareOf(out)));
    });
}

template <class Cell>
void joinSums(Sums<Cell> a, Sums<Cell> b, Sums<Cell> out, ptrdiff_t n) {
    forVectorsOf<Cell>(n, [=](ptrdiff_t x) {
        if (out.values != nullptr) store(out.values + x, load(a.values + x) + load(b.values + x));
        store(out.squares + x, load(a.squares + x) + load(b.squares + x));
    });
}

template <class Cell>
void sumAlong(const Cell* columns, ptrdiff_t width, Cell* spans, Cell* out, ptrdiff_t n) {
    ptrdiff_t done = 0;  // columns of each window that `out` has
    for (ptrdiff_t span = 1;; span *= 2) {
        const Cell* const from = span == 1 ? columns : spans;
        if ((width & span) != 0) {
            const bool isFirst = done == 0;
            forVectorsOf<Cell>(n, [=](ptrdiff_t x) {
                store(out + x, isFirst ? load(from + x) : load(out + x) + load(from + x + done));
            });
            done += span;
        }
        if (2 * span > width) break;
        // Each vector is read before it is overwritten: what it adds lies behind it.
        forVectorsOf<Cell>(n + width - 2 * span,
                           [=](ptrdiff_t x) { store(spans + x, load(from + x) + load(from + x + span)); });
    }
}

#define QORI_SUMS_OF(Cell)                                                         \
    template void addRow<Cell>(const Cell*, Sums<Cell>, Sums<Cell>, ptrdiff_t);    \
    template void slideRow<Cell>(const Cell*, const Cell*, Sums<Cell>, ptrdiff_t); \
    template void joinSums<Cell>(Sums<Cell>, Sums<Cell>, Sums<Cell>, ptrdiff_t);   \
    template void sumAlong<Cell>(const Cell*, ptrdiff_t, Cell*, Cell*, ptrdiff_t);
QORI_SUMS_OF(Pair)
QORI_SUMS_OF(double)
#undef QORI_SUMS_OF

}  // namespace qori::kernels::correlation
