// SPDX-License-Identifier: Apache-2.0
#include "kernels/correlation/cells.h"

#include <algorithm>

namespace qori::kernels::correlation {

namespace {

/// The loop for each channel count has a stride that the compiler knows.
template <class T, class Use>
QORI_INLINE void withChannels(const T* from, int channels, ptrdiff_t n, Use use) {
    switch (channels) {
        case 1:
            for (ptrdiff_t x = 0; x < n; ++x) use(x, from[x]);
            break;
        case 3:
            for (ptrdiff_t x = 0; x < n; ++x) use(x, from[3 * x]);
            break;
        default:
            for (ptrdiff_t x = 0; x < n; ++x) use(x, from[4 * x]);
    }
}

}  // namespace

template <class T>
void readCells(const T* from, int channels, RowSpan span, double offset, double* cells) {
    std::fill_n(cells, span.before, 0.0 - offset);
    cells += span.before;
    withChannels(from, channels, span.inside,
                 [=](ptrdiff_t x, T element) { cells[x] = static_cast<double>(element) - offset; });
    std::fill_n(cells + span.inside, span.behind, 0.0 - offset);
}

template <class T>
void readCells(const T* from, int channels, RowSpan span, int16_t* buffer, Pair* cells) {
    std::fill_n(buffer, span.before, int16_t{0});
    int16_t* const inside = buffer + span.before;
    withChannels(from, channels, span.inside, [=](ptrdiff_t x, T element) { inside[x] = element; });
    std::fill_n(inside + span.inside, span.behind + 1, int16_t{0});
    for (ptrdiff_t x = 0; x < span.total(); ++x) {
        const auto right = static_cast<uint32_t>(static_cast<uint16_t>(buffer[x + 1]));
        cells[x] = static_cast<Pair>(static_cast<uint16_t>(buffer[x]) | right << 16);
    }
}

#define QORI_CELLS_OF(T) template void readCells<T>(const T*, int, RowSpan, double, double*);
QORI_CELLS_OF(uint8_t)
QORI_CELLS_OF(int8_t)
QORI_CELLS_OF(uint16_t)
QORI_CELLS_OF(float)
QORI_CELLS_OF(double)
#undef QORI_CELLS_OF

template void readCells<uint8_t>(const uint8_t*, int, RowSpan, int16_t*, Pair*);
template void readCells<int8_t>(const int8_t*, int, RowSpan, int16_t*, Pair*);

}  // namespace qori::kernels::correlation
