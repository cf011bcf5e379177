// SPDX-License-Identifier: Apache-2.0
// Cosine transforms by their definition, one sum per coefficient and direction.
#pragma once
#include <algorithm>
#include <cmath>
#include <cstdint>
#include <numbers>
#include <vector>

namespace qori::test::reference {

/// Basis of the orthonormal DCT-II of n points: row k holds frequency k.
inline std::vector<double> cosineBasis(int n) {
    std::vector<double> basis(static_cast<size_t>(n) * static_cast<size_t>(n));
    for (int k = 0; k < n; ++k)
        for (int x = 0; x < n; ++x) {
            // The angle is reduced exactly, in integers, before it meets pi.
            const auto turns = static_cast<int64_t>(2 * x + 1) * k % (4 * int64_t{n});
            const long double angle = std::numbers::pi_v<long double> * static_cast<long double>(turns) / (2 * n);
            const long double scale = std::sqrt((k == 0 ? 1.0L : 2.0L) / n);
            basis[static_cast<size_t>(k * n + x)] = static_cast<double>(scale * std::cos(angle));
        }
    return basis;
}

/// Along each row of n elements, `rows` of them: frequencies, or elements of frequencies where it is inverse.
inline std::vector<double> transformRows(const std::vector<double>& in, int n, int rows, bool inverse) {
    const std::vector<double> basis = cosineBasis(n);
    std::vector<double> out(in.size());
    for (int y = 0; y < rows; ++y)
        for (int k = 0; k < n; ++k) {
            double sum = 0;
            for (int x = 0; x < n; ++x)
                sum += in[static_cast<size_t>(y * n + x)] * basis[static_cast<size_t>(inverse ? x * n + k : k * n + x)];
            out[static_cast<size_t>(y * n + k)] = sum;
        }
    return out;
}

inline std::vector<double> turned(const std::vector<double>& in, int width, int height) {
    std::vector<double> out(in.size());
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x)
            out[static_cast<size_t>(x * height + y)] = in[static_cast<size_t>(y * width + x)];
    return out;
}

/// The orthonormal transform of an image, row by row.
inline std::vector<double> cosineTransform(const std::vector<double>& in, int width, int height, bool inverse) {
    const std::vector<double> rows = transformRows(in, width, height, inverse);
    return turned(transformRows(turned(rows, width, height), height, width, inverse), height, width);
}

/// An 8x8 block by the basis as it was made once.
inline std::vector<double> blockTransform(const std::vector<double>& in, bool inverse) {
    static const std::vector<double> basis = cosineBasis(8);
    std::vector<double> rows(64), out(64);
    const auto weight = [&](size_t k, size_t x) { return basis[inverse ? x * 8 + k : k * 8 + x]; };
    for (size_t y = 0; y < 8; ++y)
        for (size_t k = 0; k < 8; ++k)
            for (size_t x = 0; x < 8; ++x) rows[8 * y + k] += in[8 * y + x] * weight(k, x);
    for (size_t k = 0; k < 8; ++k)
        for (size_t y = 0; y < 8; ++y)
            for (size_t u = 0; u < 8; ++u) out[8 * k + u] += rows[8 * y + u] * weight(k, y);
    return out;
}

/// To nearest, halves up, saturated to 16 bits.
inline int roundedWord(double value) {
    return static_cast<int>(std::clamp(std::floor(value + 0.5), -32768.0, 32767.0));
}

}  // namespace qori::test::reference
