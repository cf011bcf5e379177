// SPDX-License-Identifier: Apache-2.0
// The scalar truth of thresholds, and of Otsu's choice of one.
#pragma once
#include <algorithm>
#include <array>
#include <cstdint>
#include <vector>

namespace qori::test::reference {

template <class T>
T replaceAbove(T src, T threshold, T value) {
    return src > threshold ? value : src;
}

template <class T>
T replaceBelow(T src, T threshold, T value) {
    return src < threshold ? value : src;
}

/// Every sum from its beginning for every level; doubles all the way.
inline uint8_t otsu(const std::vector<uint8_t>& elements) {
    std::array<double, 256> counts{};
    for (uint8_t v : elements) ++counts[v];
    const double inverse = 1.0 / static_cast<double>(elements.size()), tiny = 1.1920928955078125e-7;
    const auto sumUpTo = [&](size_t last, auto term) {
        double sum = 0;
        for (size_t j = 0; j <= last; ++j) sum += term(j);
        return sum;
    };
    const auto share = [&](size_t j) { return counts[j] * inverse; };
    const double mean = inverse * sumUpTo(255, [&](size_t j) { return (static_cast<double>(j) + 0.5) * counts[j]; });
    double most = 0, best = 0;
    for (size_t i = 0; i < 256; ++i) {
        const double w0 = sumUpTo(i, share), w1 = 1 - w0;
        if (std::min(w0, w1) < tiny || std::max(w0, w1) > 0.9999998807907104) continue;
        const double mu0 = sumUpTo(i, [&](size_t j) { return (static_cast<double>(j) + 0.5) * share(j); }) / w0;
        const double mu1 = (mean - w0 * mu0) / w1, difference = mu0 - mu1;
        const double variance = w0 * w1 * (difference * difference);
        if (variance > most) {
            most = variance;
            best = static_cast<double>(i) + 0.5;
        }
    }
    return static_cast<uint8_t>(best);
}

}  // namespace qori::test::reference
