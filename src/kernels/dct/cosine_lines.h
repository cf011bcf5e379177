// SPDX-License-Identifier: Apache-2.0
// Cosine coefficients of sequences whose Fourier transform stands in lines, and the way back. Sequences come in strips
// of two groups of eight. Of even length, a group has its own lines, points of two elements each; of odd length both
// share the lines, one group the real parts, the other the imaginary ones.
#pragma once
#include "cosine_table.h"

namespace qori::kernels {

inline constexpr int kStripGroups = 2, kGroupColumns = kLineColumns;

/// Floats of the lines of a strip, and of as many elements in their order.
constexpr ptrdiff_t stripFloats(int32_t n) { return ptrdiff_t{kLineFloats} * n; }

/// Where the elements of a strip are in its lines.
class StripOrder {
public:
    explicit StripOrder(const CosineTable& table)
        : n_(table.n), isOdd_(table.isOdd()), positions_(table.fourier()->positions()) {}

    /// Before a forward transform.
    QORI_INLINE ptrdiff_t before(int32_t i, int group) const {
        const ptrdiff_t j = place(i);
        return isOdd_ ? kLineFloats * j + kGroupColumns * group : kGroupColumns * (group * ptrdiff_t{n_} + j);
    }
    /// After an inverse one, parts exchanged.
    QORI_INLINE ptrdiff_t after(int32_t i, int group) const {
        const int32_t j = place(i);
        if (isOdd_) return ptrdiff_t{kLineFloats} * positions_[j] + kGroupColumns * (1 - group);
        return kGroupColumns * ptrdiff_t{n_} * group + ptrdiff_t{kLineFloats} * positions_[j / 2] +
               kGroupColumns * (1 - j % 2);
    }

private:
    QORI_INLINE int32_t place(int32_t i) const { return i % 2 == 0 ? i / 2 : n_ - 1 - i / 2; }

    int32_t n_;
    bool isOdd_;
    const int32_t* positions_;
};

namespace cosine {

QORI_INLINE ComplexLine conjugateTimes(ComplexLine a, const float* w) {
    return line::times(a, splat(w[0]), splat(-w[1]));
}

/// Coefficients k and n - k of twice the spectrum at k.
template <class Out>
QORI_INLINE void putPair(ComplexLine spectrum, const float* turn, int32_t k, int32_t n, Out out) {
    const ComplexLine turned = line::times(spectrum, turn);
    out(k, turned.re);
    out(n - k, zero<float>() - turned.im);
}

/// The spectrum at k, scaled, of coefficients k and n - k.
template <class In>
QORI_INLINE ComplexLine takePair(const float* turn, int32_t k, int32_t n, In in) {
    return conjugateTimes({in(k), zero<float>() - in(n - k)}, turn);
}

/// out(k, coefficients) of one group of even length, from the transform of its points.
template <class Out>
void fromHalves(const CosineTable& table, const float* lines, Out out) {
    const int32_t n = table.n, points = n / 2;
    const int32_t* const positions = table.fourier()->positions();
    const auto at = [=](int32_t k) { return line::loadLine(lines + ptrdiff_t{kLineFloats} * positions[k]); };
    const Vec<float> scale = splat(table.scale);
    const ComplexLine ends = at(0);
    out(0, (ends.re + ends.im) * scale);
    out(points, (ends.re - ends.im) * scale);
    for (int32_t k = 1; k <= points - k; ++k) {
        const ComplexLine z = at(k), y = at(points - k);
        const ComplexLine even = {z.re + y.re, z.im - y.im};
        const ComplexLine odd = line::times({z.im + y.im, y.re - z.re}, table.roots() + 2 * k);
        putPair(line::operator+(even, odd), table.turns() + 2 * k, k, n, out);
        putPair({even.re - odd.re, odd.im - even.im}, table.turns() + 2 * (points - k), points - k, n, out);
    }
}

/// Points whose transform is a group of even length of coefficients in(k), parts exchanged.
template <class In>
void toHalves(const CosineTable& table, In in, float* lines) {
    const int32_t n = table.n, points = n / 2;
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{kLineFloats} * k; };
    const Vec<float> scale = splat(table.scale), first = in(0) * scale, middle = in(points)*scale;
    line::storeLine(at(0), {first - middle, first + middle});
    for (int32_t k = 1; k <= points - k; ++k) {
        const ComplexLine x = takePair(table.turns() + 2 * k, k, n, in);
        const ComplexLine y = takePair(table.turns() + 2 * (points - k), points - k, n, in);
        const ComplexLine even = {x.re + y.re, x.im - y.im};
        const ComplexLine odd = conjugateTimes({x.re - y.re, x.im + y.im}, table.roots() + 2 * k);
        line::storeLine(at(points - k), {odd.re - even.im, even.re + odd.im});
        line::storeLine(at(k), {even.im + odd.re, even.re - odd.im});
    }
}

/// out(group, k, coefficients) of both groups of odd length.
template <class Out>
void fromPairs(const CosineTable& table, const float* lines, Out out) {
    const int32_t n = table.n;
    const int32_t* const positions = table.fourier()->positions();
    const auto at = [=](int32_t k) { return line::loadLine(lines + ptrdiff_t{kLineFloats} * positions[k]); };
    const auto outOf = [=](int group) { return [=](int32_t k, Vec<float> v) { out(group, k, v); }; };
    const Vec<float> scale = splat(table.scale);
    const ComplexLine ends = at(0);
    out(0, 0, ends.re * scale);
    out(1, 0, ends.im * scale);
    for (int32_t k = 1; k < n - k; ++k) {
        const ComplexLine z = at(k), y = at(n - k);
        putPair({z.re + y.re, z.im - y.im}, table.turns() + 2 * k, k, n, outOf(0));
        putPair({z.im + y.im, y.re - z.re}, table.turns() + 2 * k, k, n, outOf(1));
    }
}

template <class In>
void toPairs(const CosineTable& table, In in, float* lines) {
    const int32_t n = table.n;
    const auto at = [=](int32_t k) { return lines + ptrdiff_t{kLineFloats} * k; };
    const auto inOf = [=](int group) { return [=](int32_t k) { return in(group, k); }; };
    const Vec<float> scale = splat(table.scale);
    line::storeLine(at(0), {in(1, 0) * scale, in(0, 0) * scale});
    for (int32_t k = 1; k < n - k; ++k) {
        const ComplexLine a = takePair(table.turns() + 2 * k, k, n, inOf(0));
        const ComplexLine b = takePair(table.turns() + 2 * k, k, n, inOf(1));
        line::storeLine(at(k), {a.im + b.re, a.re - b.im});
        line::storeLine(at(n - k), {b.re - a.im, a.re + b.im});
    }
}

}  // namespace cosine

/// From elements in the order of StripOrder::before to out(group, k, coefficients).
template <class Out>
void cosinesOfStrip(const CosineTable& table, float* lines, int groups, float* work, Out out) {
    if (table.isOdd()) {
        transformLines(table.fourier(), lines, work);
        return cosine::fromPairs(table, lines, out);
    }
    for (int group = 0; group < groups; ++group, lines += stripFloats(table.n / 2)) {
        transformLines(table.fourier(), lines, work);
        cosine::fromHalves(table, lines, [=](int32_t k, Vec<float> v) { out(group, k, v); });
    }
}

/// From coefficients in(group, k) to elements in the order of StripOrder::after.
template <class In>
void stripOfCosines(const CosineTable& table, In in, float* lines, int groups, float* work) {
    if (table.isOdd()) {
        cosine::toPairs(table, in, lines);
        return transformLines(table.fourier(), lines, work);
    }
    for (int group = 0; group < groups; ++group, lines += stripFloats(table.n / 2)) {
        cosine::toHalves(
            table, [=](int32_t k) { return in(group, k); }, lines);
        transformLines(table.fourier(), lines, work);
    }
}

}  // namespace qori::kernels
