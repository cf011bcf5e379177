// SPDX-License-Identifier: Apache-2.0
// Correlation by its definition, one placement at a time: means first, then sums around them.
#pragma once
#include <cmath>
#include <utility>
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

/// `condition` is by how much a window's energy may be smaller than the squares that it is a difference of, and
/// rounding errors larger than those of a number.
struct Score {
    double value, condition;
};

/// Of a template and the windows of a source, outside of which there are zeros.
class Correlation {
public:
    Correlation(Plane source, Plane tpl, Normaliser normaliser)
        : source_(std::move(source)), tpl_(std::move(tpl)), normaliser_(normaliser) {
        if (isCentred()) {
            double sum = 0;
            for (const double tap : tpl_.elements) sum += tap;
            for (double& tap : tpl_.elements) tap -= sum / area();
        }
        for (const double tap : tpl_.elements) squares_ += tap * tap;
        for (const double element : source_.elements) largest_ = std::fmax(largest_, std::fabs(element));
    }

    /// With the template's corner at (x, y) of the source.
    Score at(int x, int y) const {
        double mean = 0, window = 0, cross = 0;
        if (isCentred()) forWindow(x, y, [&](double s, double) { mean += s / area(); });
        forWindow(x, y, [&](double s, double t) {
            window += (s - mean) * (s - mean);
            cross += (s - mean) * t;
        });
        if (normaliser_ == Normaliser::none) return {cross, 1};
        if (!isCentred()) return {window > 0 && squares_ > 0 ? cross / std::sqrt(window * squares_) : 0, 1};
        const double epsilon = std::ldexp(1.0, -23), norm = std::sqrt(std::fmax(squares_, epsilon));
        if (norm * epsilon > window) return {0, 1};
        return {cross / (std::sqrt(window) * norm), 1 + 4 * area() * largest_ * largest_ / window};
    }

private:
    bool isCentred() const { return normaliser_ == Normaliser::centred; }
    double area() const { return static_cast<double>(tpl_.elements.size()); }
    template <class Use>
    void forWindow(int x, int y, Use use) const {
        const double* tap = tpl_.elements.data();
        for (int j = 0; j < tpl_.height; ++j)
            for (int i = 0; i < tpl_.width; ++i) use(source_.at(x + i, y + j), *tap++);
    }

    Plane source_, tpl_;
    Normaliser normaliser_;
    double squares_ = 0, largest_ = 0;
};

}  // namespace qori::test::reference
