// SPDX-License-Identifier: Apache-2.0
// Transforms for cyclic correlation, of four columns at once, in doubles: sums of products of integers come out so
// close to the integer that rounding makes them exact, and windows of little contrast keep their digits beside bright
// ones.
//
// Points are lines (transform/butterflies.h) of four real parts and four imaginary ones. A plane is made of quads of
// rows: a quad's line x has four rows in its lanes, so that rows are transformed as they lie. Columns are turned into
// lines of four columns, transformed, multiplied, transformed back and turned into quads again, four columns at a time.
//
// Forth is decimation in frequency, back is decimation in time, so that frequencies need not be put in order between
// them. Back works on numbers whose parts have changed places, which makes its roots those of forth.
#pragma once
#include <algorithm>

#include "kernels/transform/butterflies.h"
#include "kernels/transform/roots.h"

namespace qori::kernels::correlation {

inline constexpr int kQuad = 4, kLineDoubles = 2 * kQuad;

/// Transforms of one length, a product of 2s, 3s and 5s.
class LineTransform {
public:
    /// The shortest such length from n on that is a multiple of 4.
    static int64_t lengthFrom(int64_t n);
    static int64_t tableDoubles(int64_t length);

    explicit LineTransform(int64_t length) : length_(static_cast<int32_t>(length)) {}
    void makeTables(double* tables);
    int32_t length() const { return length_; }

    void forth(double* lines) const;
    void back(double* lines) const;

private:
    static constexpr int kMostStages = 24;
    struct Stage {
        int32_t radix, part;
        const double *turns, *twiddles;
    };

    int32_t length_, stageCount_ = 0;
    Stage stages_[kMostStages];
};

/// Four rows of real parts and four of imaginary ones become lines; n is a multiple of 4.
void rowsToLines(const double* re, const double* im, ptrdiff_t pitch, ptrdiff_t n, double* lines);

/// Lines whose parts have changed places become rows again, rounded to integers where results are integers.
void linesToRows(const double* lines, ptrdiff_t n, bool isInteger, double* re, double* im, ptrdiff_t pitch);

/// Quads of a plane, so many doubles apart, of which only the first ones have elements other than 0.
struct Quads {
    double* first;
    ptrdiff_t pitch, count;
};

/// The columns' transform of a template, conjugate and scaled, four columns after the other.
void makeSpectrum(const LineTransform& columns, Quads plane, ptrdiff_t width, double scale, double* spectrum);

/// Correlates the columns of a plane with the spectrum's; `wanted` quads come back, parts exchanged. `lines` holds the
/// columns' length.
void correlateColumns(const LineTransform& columns, Quads plane, ptrdiff_t width, const double* spectrum, double* lines,
                      ptrdiff_t wanted);

/// The sum of squares of n cells.
double sumOfSquares(const double* cells, ptrdiff_t n);

}  // namespace qori::kernels::correlation
