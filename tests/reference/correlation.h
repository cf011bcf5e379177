// SPDX-License-Identifier: Apache-2.0
// Correlation by its definition, one placement at a time: means first, then sums around them.
#pragma once
#include <cmath>
#include <vector>

#include "harness/image.h"

namespace qori::test::reference {

enum class Placement { full, valid, same };
enum class Normaliser { none, energy, centred };

/// Of one channel.
struct Plane {
    int width, height;
    std::vector<double> elements;

    double at(int x, int y) const {
        const bool inside = x >= 0 && x < width && y >= 0 && y < height;
        return inside ? elements[static_cast<size_t>(y) * static_cast<size_t>(width) + static_cast<size_t>(x)] : 0;
    }
};

template <class T>
Plane plane(View<T> image, QorImageSize size, int channel) {
    Plane plane{size.width, size.height, {}};
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width; ++x) plane.elements.push_back(static_cast<double>(image.get(x, y, channel)));
    return plane;
}

/// Results per axis: how many, and where the first placement begins in the source.
struct Axis {
    int count, first;
};
inline Axis axis(Placement placement, int source, int length) {
    switch (placement) {
        case Placement::full: return {source + length - 1, 1 - length};
        case Placement::valid: return {source - length + 1, 0};
        default: return {source, -(length / 2)};
    }
}

/// Of the template at (x, y) of the source, outside of which there are zeros.
inline double correlationAt(const Plane& source, const Plane& tpl, int x, int y, Normaliser normaliser) {
    const double area = static_cast<double>(tpl.elements.size());
    const auto sumOf = [&](auto term) {
        double sum = 0;
        for (int j = 0; j < tpl.height; ++j)
            for (int i = 0; i < tpl.width; ++i) sum += term(source.at(x + i, y + j), tpl.at(i, j));
        return sum;
    };
    const bool centred = normaliser == Normaliser::centred;
    const double s0 = centred ? sumOf([](double s, double) { return s; }) / area : 0;
    const double t0 = centred ? sumOf([](double, double t) { return t; }) / area : 0;
    const double cross = sumOf([=](double s, double t) { return (s - s0) * (t - t0); });
    if (normaliser == Normaliser::none) return cross;
    const double window = sumOf([=](double s, double) { return (s - s0) * (s - s0); });
    const double squares = sumOf([=](double, double t) { return (t - t0) * (t - t0); });
    if (!centred) return window > 0 && squares > 0 ? cross / std::sqrt(window * squares) : 0;
    const double epsilon = std::ldexp(1.0, -23), norm = std::sqrt(std::fmax(squares, epsilon));
    return norm * epsilon > window ? 0 : cross / (std::sqrt(window) * norm);
}

}  // namespace qori::test::reference
