// SPDX-License-Identifier: Apache-2.0
// The scalar truth of tables by levels and of palettes: every element by itself, from the definition.
#pragma once
#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>
#include <vector>

#include "keeps_nan.h"

namespace qori::test::reference {

template <class T>
using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

template <class L>
struct LevelTable {
    std::vector<L> levels, values;
};

enum class Form { step, linear, cubic };

/// The interval that counts for an element, or -1: the first one that holds it for floats, the last one for integers.
template <class T, class L>
int intervalOf(T v, const LevelTable<L>& table, Form form) {
    const int count = static_cast<int>(table.levels.size());
    int found = -1;
    for (int k = 0; k + 1 < count; ++k) {
        const bool holds = table.levels[size_t(k)] <= v && v < table.levels[size_t(k) + 1];
        if (holds && (found < 0 || std::is_integral_v<T>)) found = k;
    }
    const bool isTail = std::is_integral_v<T> && form == Form::step && v >= table.levels.back();
    return isTail ? -1 : found;
}

template <class T>
T saturate(double value) {
    using Limits = std::numeric_limits<T>;
    return static_cast<T>(std::clamp<double>(std::trunc(value), Limits::min(), Limits::max()));
}

template <class L>
double slope(const LevelTable<L>& table, int interval) {
    const auto k = static_cast<size_t>(interval);
    if constexpr (std::is_floating_point_v<L>) {
        const float rise = table.values[k + 1] - table.values[k], run = table.levels[k + 1] - table.levels[k];
        return double{rise} / double{run};
    } else {
        return double(int64_t{table.values[k + 1]} - table.values[k]) /
               double(int64_t{table.levels[k + 1]} - table.levels[k]);
    }
}

/// The polynomial through the given nodes by divided differences, in extended precision.
template <class L>
long double through(const LevelTable<L>& table, const std::vector<int>& nodes, long double v) {
    std::vector<long double> x, y;
    for (int node : nodes) {
        x.push_back(table.levels[size_t(node)]);
        y.push_back(table.values[size_t(node)]);
    }
    long double sum = 0, product = 1;
    for (size_t order = 0; order < x.size(); ++order) {
        sum += y[0] * product;
        product *= v - x[order];
        for (size_t i = 0; i + 1 < x.size() - order; ++i) y[i] = (y[i + 1] - y[i]) / (x[i + order + 1] - x[i]);
    }
    return sum;
}

/// The cubic of an interval; where its levels coincide, the parabola through the anchor and the interval's ends, or the
/// line through what of these is distinct.
template <class L>
long double cubic(const LevelTable<L>& table, int k, long double v) {
    const int count = static_cast<int>(table.levels.size()), j = std::clamp(k - 1, 0, count - 4), a = j + 1;
    const auto distinct = [&](std::vector<int> nodes) {
        for (size_t i = 0; i < nodes.size(); ++i)
            for (size_t l = 0; l < i; ++l)
                if (table.levels[size_t(nodes[i])] == table.levels[size_t(nodes[l])]) return false;
        return true;
    };
    if (distinct({j, j + 1, j + 2, j + 3})) return through(table, {j, j + 1, j + 2, j + 3}, v);
    if (distinct({a, k, k + 1})) return through(table, {a, k, k + 1}, v);
    return through(table, {a, distinct({a, k + 1}) ? k + 1 : k}, v);
}

template <class T, class L>
QORI_KEEPS_NAN T throughLevels(T v, const LevelTable<L>& table, Form form) {
    const int k = intervalOf(v, table, form);
    if (k < 0) return v;
    const L value = table.values[size_t(k)];
    double mapped;
    if (form == Form::step)
        mapped = value;
    else if (form == Form::linear || table.levels.size() < 4)
        mapped = std::fma(double(v) - double(table.levels[size_t(k)]), slope(table, k), double(value));
    else
        mapped = static_cast<double>(cubic(table, k, v)) + (std::is_integral_v<T> ? 0.5 : 0);
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(mapped);
    else
        return saturate<T>(mapped);
}

}  // namespace qori::test::reference
