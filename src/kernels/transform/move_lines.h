// SPDX-License-Identifier: Apache-2.0
// Between images and the lines of transforms (fourier.h). Rows are turned, eight at a time, so that lanes are rows;
// columns are gathered, eight complex ones at a time. Images may hold several channels, which have lines of their own
// where lanes are rows, and lanes of their own where lanes are columns.
#pragma once
#include <cstddef>
#include <cstdint>

#include "fourier.h"

namespace qori::kernels {

/// Rows, of which `count` are there. Element e of channel c is at e * channels + c; channels from `processed` on are
/// read, and not written.
struct LineRows {
    uint8_t* first;
    ptrdiff_t step;
    int count, channels, processed;

    float* row(ptrdiff_t y) const { return reinterpret_cast<float*>(first + y * step); }
};

/// Which of a line's parts is read or written first.
enum class Parts { inOrder, exchanged };

// Rows of several channels have the lines of each, processed or not, behind those of the one before.

/// Up to 8 rows. Element e, times the scale, becomes part e % 2 of line e / 2.
void rowsToLines(const LineRows& rows, ptrdiff_t elements, float scale, Parts parts, float* lines);
/// Element e is part e % 2 of line positions[e / 2].
void linesToRows(const float* lines, const int32_t* positions, ptrdiff_t elements, Parts parts, const LineRows& rows);

/// splitHalves and linesToRows of n elements, rowsToLines and joinHalves: the spectra of up to 8 rows of even length.
void halvesToRows(float* lines, int32_t n, const int32_t* positions, const float* roots, const LineRows& rows);
void rowsToHalves(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines);

/// Up to 16 rows of n elements: element e becomes line e, of the first eight rows its real part, of the others the
/// other one, which is 0 of rows that are alone.
void rowsToPairs(const LineRows& rows, ptrdiff_t n, float scale, bool areAlone, float* lines);
/// The spectra of splitPairs, n odd: frequency 0, then the parts of 1, 2, ...
void pairsToSpectra(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows);
/// The other way round, and joinPairs; the second spectra are 0 where rows are alone.
void spectraToPairs(const LineRows& rows, ptrdiff_t n, float scale, bool areAlone, float* lines);
/// Element e is line positions[e], parts exchanged: of the first eight rows its second part.
void pairsToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows);

// Of up to 8 rows of n elements in doubles (short_rows.h): n lines for each channel.

/// Element e becomes line e: of the first four rows its real part, of the others the imaginary one.
void rowsToWideLines(const LineRows& rows, ptrdiff_t n, float* lines);
/// Element e is line positions[e], parts exchanged.
void wideLinesToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows);
/// Spectra as floats: frequency k, eight real parts and eight imaginary ones, is where line positions[k] begins; of an
/// even n the last is the imaginary part of the first.
void spectraToRows(const float* lines, const int32_t* positions, ptrdiff_t n, const LineRows& rows);
/// Frequency k to line k.
void rowsToSpectra(const LineRows& rows, ptrdiff_t n, float* lines);

/// Complex columns, one in each of the lanes `begin` to `end`. Of one channel the parts of lane l are elements
/// element + 2 l and the next. Of several the channels of one complex column have lanes one behind the other, lane 0
/// the one of `channel`: its real part is at `element`, and all imaginary parts are `channels` elements behind the real
/// ones. Columns keep their lanes from columnsToLines to linesToColumns; lane 0 is lane 0.
struct LineColumns {
    LineRows rows;  ///< `count` of them.
    ptrdiff_t element;
    int begin, end;
    int channel = 0;
    ptrdiff_t ahead = 0;  ///< Elements to those that are read next, which are asked for while these are read.
};

/// Row y becomes line y; lanes without a column hold nothing of use.
void columnsToLines(const LineColumns& columns, float scale, Parts parts, float* lines);
/// Row y is line positions[y].
void linesToColumns(const float* lines, const int32_t* positions, Parts parts, const LineColumns& columns);

/// Columns to lines, their transform, lines to columns: in one go where blocks and the length allow it.
void transformColumns(const FourierTable* table, const LineColumns& from, const LineColumns& to, float scale,
                      Parts parts, float* lines, float* work);

/// The transform of eight complex columns of the layout between rows and columns into the packed one, whose rows begin
/// a pixel earlier: `carry` has a pixel a row that comes behind these, and gets those that come before. Blocks are
/// whole, of one channel or of four, and the length is made for it.
bool areColumnsShiftable(const FourierTable* table, const LineColumns& columns);
void transformColumnsShifted(const FourierTable* table, const LineColumns& columns, float scale, float* carry,
                             float* lines);

// Single columns are those of one channel; its lane takes the place of lane 0 where `lines` begins with it.

/// Packs spectra of n real values: frequency 0, the parts of 1, 2, ..., of an even n the last. Lane 0 holds the
/// transform of a + i b; the frequencies of a go to a column, those of b to n floats.
void splitRealColumns(const float* lines, const int32_t* positions, const LineRows& column, float* second);
/// Lane 0 holds the transform of the column's values alone.
void packRealColumn(const float* lines, const int32_t* positions, const LineRows& column);
/// Makes lane 0, parts exchanged, of such spectra; the second is 0 where it is null.
void joinRealColumns(const LineRows& column, const float* second, float scale, float* lines);

/// Of an odd width the only real column: lane 0 of the lines with no imaginary part, and the other way round, parts
/// exchanged.
void joinRealColumn(const LineRows& column, float scale, float* lines);
void storeRealColumn(const float* lines, const int32_t* positions, const LineRows& column);

/// The imaginary parts of lane 0, in order, to a column.
void copyImaginary(const float* lines, const LineRows& column);

/// A column of single elements.
void columnToFloats(const LineRows& column, float* out);
void floatsToColumn(const float* in, const LineRows& column);

}  // namespace qori::kernels
