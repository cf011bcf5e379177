// SPDX-License-Identifier: Apache-2.0
// Resize by its definition: every destination pixel from a list of source indices and weights per axis.
#pragma once
#include <algorithm>
#include <cmath>
#include <cstdint>
#include <numbers>
#include <numeric>
#include <vector>

#include "qori.h"

namespace qori::test::reference {

struct Method {
    int32_t interpolation;
    bool antialiasing = false;
    float b = 0, c = 0.5f;
    int lobes = 3;

    int support() const { return interpolation == interpLinear ? 1 : interpolation == interpCubic ? 2 : lobes; }
};

struct Tap {
    int index;
    double weight;
};

inline double lanczosSample(int lobes, double t) {
    if (t == 0) return 1;
    const double x = std::numbers::pi * t;
    return t >= lobes ? 0 : lobes * std::sin(x) * std::sin(x / lobes) / (x * x);
}

inline double kernel(const Method& m, double distance) {
    const double t = std::abs(distance), b = m.b, c = m.c;
    if (m.interpolation == interpLinear) return std::max(0.0, 1 - t);
    if (m.interpolation == interpCubic) {
        if (t < 1) return ((12 - 9 * b - 6 * c) * t * t * t + (-18 + 12 * b + 6 * c) * t * t + 6 - 2 * b) / 6;
        if (t < 2)
            return ((-b - 6 * c) * t * t * t + (6 * b + 30 * c) * t * t + (-12 * b - 48 * c) * t + 8 * b + 24 * c) / 6;
        return 0;
    }
    const int perPixel = m.lobes == 2 ? 200 : 100;
    const double at = t * perPixel, below = std::floor(at);
    const double first = lanczosSample(m.lobes, below / perPixel),
                 second = lanczosSample(m.lobes, (below + 1) / perPixel);
    return t >= m.lobes ? 0 : first + (at - below) * (second - first);
}

inline double ratio(int src, int dst) {
    const int divisor = std::gcd(src, dst);
    src /= divisor;
    dst /= divisor;
    return static_cast<double>(src) / dst;
}

/// Half of the filter's width in source pixels along an axis; 0 for nearest and super.
inline int halfWidth(const Method& m, int src, int dst) {
    if (m.interpolation == interpNearest || m.interpolation == interpSuper) return 0;
    return m.antialiasing && src > dst ? (m.support() * src + dst - 1) / dst : m.support();
}

inline std::vector<Tap> superTaps(int64_t src, int64_t dst, int64_t i) {
    std::vector<Tap> taps;  // in units of 1 / dst source pixels
    for (int64_t s = i * src / dst; s * dst < (i + 1) * src; ++s) {
        const int64_t covered = std::min((s + 1) * dst, (i + 1) * src) - std::max(s * dst, i * src);
        taps.push_back({static_cast<int>(s), static_cast<double>(covered) / static_cast<double>(src)});
    }
    return taps;
}

/// Weights of one destination position; indices may lie outside the source.
inline std::vector<Tap> taps(const Method& m, int src, int dst, int i) {
    const double r = ratio(src, dst);
    if (m.interpolation == interpNearest) return {{static_cast<int>(std::fma(i + 0.5, r, -1e-10)), 1.0}};
    if (m.interpolation == interpSuper) return superTaps(src, dst, i);
    const double x = std::fma(i + 0.5, r, -0.5), scale = m.antialiasing && r > 1 ? 1 / r : 1;
    const int half = halfWidth(m, src, dst), at = static_cast<int>(std::floor(x));
    std::vector<Tap> taps;
    double sum = 0;
    for (int k = at - half + 1; k <= at + half; ++k) {
        taps.push_back({k, kernel(m, scale * (k - x))});
        sum += taps.back().weight;
    }
    if (m.antialiasing || m.interpolation == interpLanczos)
        for (Tap& tap : taps) tap.weight /= sum;
    return taps;
}

/// The value before rounding, and how far single-precision sums may be from it in units of the precision.
struct Weighted {
    double value, error;
};

/// fetch(x, y) is the source pixel, borders included. Each weight is rounded (linear ones twice), each tap adds one
/// rounding, super one more for its scale; all relative to the largest term there can be.
template <class Fetch>
Weighted weigh(const std::vector<Tap>& columns, const std::vector<Tap>& rows, Fetch fetch) {
    double sum = 0, largest = 0, across = 0, down = 0;
    for (const Tap& row : rows)
        for (const Tap& column : columns) {
            const double p = static_cast<double>(fetch(column.index, row.index));
            sum += row.weight * column.weight * p;
            largest = std::max(largest, std::abs(p));
        }
    for (const Tap& column : columns) across += std::abs(column.weight);
    for (const Tap& row : rows) down += std::abs(row.weight);
    return {sum, static_cast<double>(columns.size() + rows.size() + 6) * largest * across * down};
}

/// Whether 8u is summed with weights in units of 2^-14. Plain cubic ones are only where that loses nothing.
inline bool inUnits(const Method& m, QorImageSize src, QorImageSize dst, size_t columnTaps, size_t rowTaps) {
    const bool free = m.antialiasing || m.interpolation == interpLanczos || m.interpolation == interpSuper;
    return free && columnTaps <= 16 && rowTaps <= 16 && src.width <= 4 * dst.width && src.height <= 4 * dst.height;
}

/// How far such sums may be from the value. Of n weights all but one are off by half a unit at most, and that one by
/// what makes the errors' sum 0, so that they weigh distances from 128 only. Rows are rounded to 2^-7 in between.
inline double errorOfUnits(const std::vector<Tap>& columns, const std::vector<Tap>& rows) {
    const auto errors = [](const std::vector<Tap>& taps) { return static_cast<double>(taps.size() - 1) * 0x1p-14; };
    double across = 0, down = errors(rows);
    for (const Tap& column : columns) across += std::abs(column.weight);
    for (const Tap& row : rows) down += std::abs(row.weight);
    const double ofRow = 128 * errors(columns) + 0x1p-8;
    return down * ofRow + errors(rows) * 128 * across;
}

/// Linear 8u in its fixed-point arithmetic.
template <class Fetch>
uint8_t linear8u(const std::vector<Tap>& columns, const std::vector<Tap>& rows, Fetch fetch) {
    const auto fixed = [](const Tap& second) { return static_cast<int>(second.weight * 16384 + 1e-7); };
    const int wx = fixed(columns[1]), wy = fixed(rows[1]);
    const auto across = [&](int y) {
        const uint8_t p0 = fetch(columns[0].index, y), p1 = fetch(columns[1].index, y);
        return (p0 * (16384 - wx) + p1 * wx + 128) >> 8;
    };
    const int out = (across(rows[0].index) * (16384 - wy) + across(rows[1].index) * wy + 0x80000) >> 20;
    return static_cast<uint8_t>(std::clamp(out, 0, 255));
}

}  // namespace qori::test::reference
