// SPDX-License-Identifier: Apache-2.0
// Spectra of rows of few real elements, in doubles: all of it, or where the points of half as many come apart. What is
// special about real rows costs a rounding or two, a large part of all where rows are short.
//
// Points are lines (butterflies.h) of four doubles each: of eight rows the first four are the real parts, the others
// the imaginary ones, so that one transform serves all and the two spectra come apart by sums.
#pragma once
#include "move_lines.h"

namespace qori::kernels {

inline constexpr int32_t kMostShortRow = 128;

/// Whether columns of this length, or rows that are few, are worth it: up to 16 elements, and where floats were
/// measured to have larger errors than another library's have.
constexpr bool isShortLength(int32_t n) {
    switch (n) {
        case 18:
        case 20:
        case 24:
        case 25:
        case 27:
        case 32:
        case 36:
        case 49:
        case 54:
        case 64:
        case 81:
        case 128: return true;
        default: return n <= 16;
    }
}

/// Whether rows are. Where there are more than eight, the errors of columns are larger than what wide halves leave of
/// the rows'; odd ones have no halves.
constexpr bool isShortRow(int32_t width, int32_t height) {
    return isShortLength(width) && (width <= 16 || width % 2 == 1 || height <= kLineColumns);
}
constexpr bool hasWideHalves(int32_t width, int32_t height) {
    return width % 2 == 0 && isShortLength(width) && !isShortRow(width, height);
}

/// Tables of one length; no addresses. At a multiple of 64.
struct ShortRowTable {
    static constexpr int kMostStages = 4;  ///< 81 is 3 * 3 * 3 * 3.

    struct Stage {
        int32_t radix, part;
        int32_t turns;     ///< Where cosines and sines of 2 pi q / radix are, of an odd radix, for q to its half.
        int32_t twiddles;  ///< Where (radix - 1) factors for each of `part` points are.
    };

    int32_t points, stageCount;
    Stage stages[kMostStages];
    int32_t positions[kMostShortRow];  ///< The line that a frequency comes out in.

    template <class T>
    const T* at(int32_t offset) const {
        return reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(this) + offset);
    }
};

/// Of a length that isShortLength.
int64_t shortRowTableBytes(int32_t n);
void makeShortRowTable(ShortRowTable* table, int32_t n);

/// Bytes of the lines of one channel.
constexpr int64_t shortRowLines(int32_t n) { return int64_t{n} * kLineBytes; }

/// Spectra, times the scale, of up to 8 rows: of an even length frequency 0, frequency n / 2, the parts of 1, 2, ...;
/// of an odd one frequency 0, the parts of 1, 2, ... Source and destination may be one.
void shortRowsToSpectra(const ShortRowTable& table, const LineRows& src, float scale, float* lines,
                        const LineRows& dst);
/// The way back, in place.
void shortSpectraToRows(const ShortRowTable& table, const LineRows& rows, float scale, float* lines);

/// Whether the columns of an image this narrow, which are all real, go the same way.
constexpr bool areShortColumns(int32_t width, int32_t height) {
    return width <= 2 && (isShortLength(height) || height == 48);
}

/// splitHalves and joinHalves of fourier.h with everything between the points and the frequencies in doubles. Roots are
/// pairs of doubles, n / 4 + 1 of them.
void makeWideHalfRoots(double* roots, int32_t n);
void splitWideHalves(float* lines, int32_t n, const int32_t* positions, const double* roots);
void joinWideHalves(float* lines, int32_t n, const double* roots);

/// Columns of single elements; the second may have none.
struct ColumnPair {
    LineRows first, second;
};

/// To packed spectra, times the scale, in place; and back.
void shortColumnsToSpectra(const ShortRowTable& table, const ColumnPair& columns, float scale, float* lines);
void shortSpectraToColumns(const ShortRowTable& table, const ColumnPair& src, float scale, float* lines,
                           const ColumnPair& dst);

}  // namespace qori::kernels
