// SPDX-License-Identifier: Apache-2.0
// How an image reaches the library: a pointer to the first pixel of the region and a step in bytes.
#pragma once
#include <array>
#include <cstddef>
#include <cstdint>
#include <type_traits>

#include "qori.h"

namespace qori {

enum class Layout { C1, C2, C3, C4, AC4, P2, P3, P4, C3C, C4C };

/// Channels that a pixel holds in memory.
constexpr int channels(Layout layout) {
    switch (layout) {
        case Layout::C1: return 1;
        case Layout::C2:
        case Layout::P2: return 2;
        case Layout::C3:
        case Layout::P3:
        case Layout::C3C: return 3;
        default: return 4;
    }
}

/// Channels that an operation reads and writes: alpha is not among them.
constexpr int processedChannels(Layout layout) {
    switch (layout) {
        case Layout::AC4: return 3;
        case Layout::C3C:
        case Layout::C4C: return 1;
        default: return channels(layout);
    }
}

template <class T>
constexpr int elementBytes = static_cast<int>(sizeof(T));

/// Bytes of a pixel in memory.
template <class T, Layout layout>
constexpr int pixelSize = channels(layout) * elementBytes<T>;

template <class T>
auto* asBytes(T* row) {
    return reinterpret_cast<std::conditional_t<std::is_const_v<T>, const uint8_t, uint8_t>*>(row);
}

template <class T>
T* advance(T* row, ptrdiff_t bytes) {
    return reinterpret_cast<T*>(asBytes(row) + bytes);
}

template <class T>
struct Image {
    T* data;
    int32_t step;

    T* row(int32_t y) const { return advance(data, ptrdiff_t{y} * step); }
};

/// Rows of n planes at one height.
template <class T, int n>
struct PlaneRows {
    T* plane[n];

    T* operator[](size_t index) const { return plane[index]; }
};

template <class T, int n>
auto asBytes(PlaneRows<T, n> rows) {
    std::array<decltype(asBytes(rows[0])), n> planes;
    for (size_t i = 0; i < n; ++i) planes[i] = asBytes(rows[i]);
    return planes;
}

template <class T, int n>
struct Planes {
    T* const* data;
    int32_t step;

    PlaneRows<T, n> row(int32_t y) const {
        PlaneRows<T, n> rows;
        for (int i = 0; i < n; ++i) rows.plane[i] = advance(data[i], ptrdiff_t{y} * step);
        return rows;
    }
};

}  // namespace qori
