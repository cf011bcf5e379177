// SPDX-License-Identifier: Apache-2.0
// The spectra of even rows: what splitHalves and joinHalves compute, on the way to the image and from it. Frequencies
// go by two, k and k + 1 with their mirrors, of which one waits for its neighbour.
#include "fourier.h"
#include "turned_rows.h"

namespace qori::kernels {
namespace {

/// Two neighbouring frequencies of each channel, pixels 2 k to 2 k + 3.
template <int channels>
struct TwoLines {
    Vec<float> part[4][channels];  ///< Of both, the real parts and the imaginary ones.

    QORI_INLINE void set(int which, int channel, ComplexLine a) {
        part[2 * which][channel] = a.re;
        part[2 * which + 1][channel] = a.im;
    }
    QORI_INLINE ComplexLine get(int which, int channel) const {
        return {part[2 * which][channel], part[2 * which + 1][channel]};
    }

    QORI_INLINE void storeTo(line::EightRows rows, ptrdiff_t k) const {
#pragma GCC unroll 4
        for (int g = 0; g < channels; ++g) {
            Vec<float> v[4];
#pragma GCC unroll 4
            for (int i = 0; i < 4; ++i) v[i] = part[(4 * g + i) / channels][(4 * g + i) % channels];
            line::storeTurned(rows, 2 * k * channels + 4 * g, v);
        }
    }
    QORI_INLINE static TwoLines loadFrom(line::EightRows rows, ptrdiff_t k, Vec<float> scale) {
        TwoLines lines;
#pragma GCC unroll 4
        for (int g = 0; g < channels; ++g) {
            Vec<float> v[4];
            line::loadTurned(rows, 2 * k * channels + 4 * g, v);
#pragma GCC unroll 4
            for (int i = 0; i < 4; ++i) lines.part[(4 * g + i) / channels][(4 * g + i) % channels] = v[i] * scale;
        }
        return lines;
    }
};

/// Two halves of the points and whole rows let frequencies and mirrors go by two.
bool goByTwo(const LineRows& rows, ptrdiff_t n) { return line::isPlain(rows) && n % 8 == 0; }

template <int channels>
QORI_NOINLINE void splitByTwo(const float* lines, int32_t n, const int32_t* positions, const float* roots,
                              const LineRows& rows) {
    const line::EightRows out(rows);
    const ptrdiff_t points = n / 2, apart = ptrdiff_t{n} * kLineColumns;
    const auto at = [=](ptrdiff_t k, int c) {
        return line::loadLine(lines + c * apart + ptrdiff_t{positions[k]} * kLineFloats);
    };
    const auto split = [=](ptrdiff_t k, int c) {
        return line::splitHalf(at(k, c), at(points - k, c), roots + kHalfRootFloats * k);
    };
    TwoLines<channels> ends, waiting;
#pragma GCC unroll 4
    for (int c = 0; c < channels; ++c) {
        const line::Halves second = split(1, c);
        ends.set(0, c, line::sumAndDifference(at(0, c)));
        ends.set(1, c, second.at);
        waiting.set(1, c, second.mirror);
    }
    ends.storeTo(out, 0);
    ptrdiff_t k = 2;
    for (; k < points - k; k += 2) {
        TwoLines<channels> low, high;
#pragma GCC unroll 4
        for (int c = 0; c < channels; ++c) {
            const line::Halves first = split(k, c), second = split(k + 1, c);
            low.set(0, c, first.at);
            low.set(1, c, second.at);
            high.set(0, c, first.mirror);
            high.set(1, c, waiting.get(1, c));
            waiting.set(1, c, second.mirror);
        }
        low.storeTo(out, k);
        high.storeTo(out, points - k);
    }
#pragma GCC unroll 4
    for (int c = 0; c < channels; ++c) {
        ends.set(0, c, split(k, c).at);
        ends.set(1, c, waiting.get(1, c));
    }
    ends.storeTo(out, k);
}

template <int channels>
QORI_NOINLINE void joinByTwo(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines) {
    const line::EightRows in(rows);
    const Vec<float> factor = splat(scale);
    const ptrdiff_t points = n / 2, apart = ptrdiff_t{n} * kLineColumns;
    const auto join = [=](ptrdiff_t k, int c, ComplexLine x, ComplexLine y) {
        const line::Halves z = line::joinHalf(x, y, roots + kHalfRootFloats * k);
        line::storeLine(lines + c * apart + (points - k) * kLineFloats, z.mirror);
        line::storeLine(lines + c * apart + k * kLineFloats, z.at);
    };
    using Two = TwoLines<channels>;
    Two waiting = Two::loadFrom(in, 0, factor);
    for (int c = 0; c < channels; ++c) line::storeLine(lines + c * apart, line::joinEnds(waiting.get(0, c)));
    ptrdiff_t k = 2;
    for (; k < points - k; k += 2) {
        const Two low = Two::loadFrom(in, k, factor), high = Two::loadFrom(in, points - k, factor);
#pragma GCC unroll 4
        for (int c = 0; c < channels; ++c) {
            join(k - 1, c, waiting.get(1, c), high.get(1, c));
            join(k, c, low.get(0, c), high.get(0, c));
            waiting.set(1, c, low.get(1, c));
        }
    }
    const Two middle = Two::loadFrom(in, k, factor);
    for (int c = 0; c < channels; ++c) {
        join(k - 1, c, waiting.get(1, c), middle.get(1, c));
        join(k, c, middle.get(0, c), middle.get(0, c));
    }
}

}  // namespace

void halvesToRows(float* lines, int32_t n, const int32_t* positions, const float* roots, const LineRows& rows) {
    if (!goByTwo(rows, n)) {
        const ptrdiff_t apart = ptrdiff_t{n} * kLineColumns;
        for (int c = 0; c < rows.processed; ++c) splitHalves(lines + c * apart, n, positions, roots);
        return linesToRows(lines, positions, n, Parts::inOrder, rows);
    }
    switch (rows.channels) {
        case 3: return splitByTwo<3>(lines, n, positions, roots, rows);
        default: return splitByTwo<1>(lines, n, positions, roots, rows);
    }
}

void rowsToHalves(const LineRows& rows, int32_t n, float scale, const float* roots, float* lines) {
    if (!goByTwo(rows, n)) {
        const ptrdiff_t apart = ptrdiff_t{n} * kLineColumns;
        rowsToLines(rows, n, scale, Parts::inOrder, lines);
        for (int c = 0; c < rows.processed; ++c) joinHalves(lines + c * apart, n, roots);
        return;
    }
    switch (rows.channels) {
        case 3: return joinByTwo<3>(rows, n, scale, roots, lines);
        default: return joinByTwo<1>(rows, n, scale, roots, lines);
    }
}

}  // namespace qori::kernels
