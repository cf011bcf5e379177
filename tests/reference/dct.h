// SPDX-License-Identifier: Apache-2.0
// Cosine transforms by their definition, one sum per coefficient and direction.
#pragma once
#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <numbers>
#include <vector>

namespace qori::test::reference {

/// The basis of the orthonormal DCT-II of n points.
class CosineBasis {
public:
    explicit CosineBasis(int n) : n_(n), cosines_(4 * static_cast<size_t>(n)) {
        for (int j = 0; j < 4 * n; ++j)
            cosines_[static_cast<size_t>(j)] =
                static_cast<double>(std::cos(std::numbers::pi_v<long double> * j / (2 * static_cast<long double>(n))));
    }
    /// Of frequency k at element x.
    double operator()(int k, int x) const {
        const auto turn = static_cast<size_t>((2 * int64_t{x} + 1) * k % (4 * int64_t{n_}));
        return cosines_[turn] * std::sqrt((k == 0 ? 1.0 : 2.0) / n_);
    }

private:
    int n_;
    std::vector<double> cosines_;
};

/// Along each row of n elements, `rows` of them: frequencies, or elements of frequencies where it is inverse.
inline std::vector<double> transformRows(const std::vector<double>& in, int n, int rows, bool inverse) {
    const CosineBasis basis(n);
    std::vector<double> out(in.size());
    for (int k = 0; k < n; ++k)
        for (int x = 0; x < n; ++x) {
            const double weight = inverse ? basis(x, k) : basis(k, x);
            for (int y = 0; y < rows; ++y)
                out[static_cast<size_t>(y * n + k)] += in[static_cast<size_t>(y * n + x)] * weight;
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
    static const std::array<std::array<double, 8>, 8> basis = [] {
        std::array<std::array<double, 8>, 8> made;
        for (int k = 0; k < 8; ++k)
            for (int x = 0; x < 8; ++x) made[static_cast<size_t>(k)][static_cast<size_t>(x)] = CosineBasis(8)(k, x);
        return made;
    }();
    std::vector<double> rows(64), out(64);
    const auto weight = [&](size_t k, size_t x) { return inverse ? basis[x][k] : basis[k][x]; };
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
