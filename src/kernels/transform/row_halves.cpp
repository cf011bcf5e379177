// SPDX-License-Identifier: Apache-2.0
// The spectra of even rows: what splitHalves and joinHalves compute, on the way to the image and from it. Frequencies
// go by two, k and k + 1 with their mirrors, of which one waits for its neighbour.
#include "fourier.h"
#include "turned_rows.h"

namespace qori::kernels {
namespace {

/// Two neighbouring frequencies, elements 2 k to 2 k + 3.
QORI_INLINE void storeTwo(line::EightRows rows, ptrdiff_t k, ComplexLine a, ComplexLine b) {
    Vec<float> v[4] = {a.re, a.im, b.re, b.im};
    line::storeTurned(rows, 2 * k, v);
}

struct TwoLines {
    ComplexLine first, second;
};

QORI_INLINE TwoLines loadTwo(line::EightRows rows, ptrdiff_t k, Vec<float> scale) {
    Vec<float> v[4];
    line::loadTurned(rows, 2 * k, v);
    return {{v[0] * scale, v[1] * scale}, {v[2] * scale, v[3] * scale}};
}

/// Two halves of the points and whole rows let frequencies and mirrors go by two.
bool goByTwo(const LineRows& rows, ptrdiff_t n) { return line::isPlain(rows) && rows.channels == 1 && n % 8 == 0; }

}  // namespace

void halvesToRows(float* lines, int32_t n, const int32_t* positions, const float* roots, const LineRows& rows) {
    if (!goByTwo(rows, n)) {
        const ptrdiff_t apart = ptrdiff_t{n} * kLineColumns;
        for (int c = 0; c < rows.processed; ++c) splitHalves(lines + c * apart, n, positions, roots);
        return linesToRows(lines, positions, n, Parts::inOrder, rows);
    }
    const line::EightRows out(rows);
    const ptrdiff_t points = n / 2;
    const auto at = [=](ptrdiff_t k) { return line::loadLine(lines + ptrdiff_t{positions[k]} * kLineFloats); };
    const auto split = [=](ptrdiff_t k) { return line::splitHalf(at(k), at(points - k), roots + kHalfRootFloats * k); };
    line::Halves second = split(1);
    storeTwo(out, 0, line::sumAndDifference(at(0)), second.at);
    ptrdiff_t k = 2;
    for (; k < points - k; k += 2) {
        const ComplexLine waiting = second.mirror;
        const line::Halves first = split(k);
        second = split(k + 1);
        storeTwo(out, k, first.at, second.at);
        storeTwo(out, points - k, first.mirror, waiting);
    }
    storeTwo(out, k, split(k).at, second.mirror);
}

void rowsToHalves(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines) {
    if (!goByTwo(rows, n)) {
        const ptrdiff_t apart = ptrdiff_t{n} * kLineColumns;
        rowsToLines(rows, n, 2 * scale, Parts::inOrder, lines);
        for (int c = 0; c < rows.processed; ++c) joinHalves(lines + c * apart, n, roots);
        return;
    }
    const line::EightRows in(rows);
    const Vec<float> factor = splat(2 * scale);
    const ptrdiff_t points = n / 2;
    const auto join = [=](ptrdiff_t k, ComplexLine x, ComplexLine y) {
        const line::Halves z = line::joinHalf(x, y, roots + kHalfRootFloats * k);
        line::storeLine(lines + (points - k) * kLineFloats, z.mirror);
        line::storeLine(lines + k * kLineFloats, z.at);
    };
    const TwoLines ends = loadTwo(in, 0, factor);
    line::storeLine(lines, line::joinEnds(ends.first));
    ComplexLine waiting = ends.second;
    ptrdiff_t k = 2;
    for (; k < points - k; k += 2) {
        const TwoLines low = loadTwo(in, k, factor), high = loadTwo(in, points - k, factor);
        join(k - 1, waiting, high.second);
        join(k, low.first, high.first);
        waiting = low.second;
    }
    const TwoLines middle = loadTwo(in, k, factor);
    join(k - 1, waiting, middle.second);
    join(k, middle.first, middle.first);
}

}  // namespace qori::kernels
