// SPDX-License-Identifier: Apache-2.0
// Windows of every make, and elements for them, for erosion and dilation by masks and by rectangles.
#pragma once
#include <cmath>
#include <functional>

#include "harness/window.h"
#include "reference/morphology.h"

namespace qori::test {

/// In floats, one image in two is nearly all NaNs, zeros of both signs, infinities and subnormals.
template <class T>
struct ExtremeElement {
    bool special = std::is_floating_point_v<T> && random().oneIn(2);

    T operator()() const {
        using Limits = std::numeric_limits<T>;
        if constexpr (std::is_floating_point_v<T>)
            if (special && !random().oneIn(16)) {
                constexpr T values[] = {T(0), -T(0), Limits::infinity(), -Limits::infinity(), Limits::denorm_min()};
                const int i = random().below(20);
                return i < 5 ? values[i] : std::copysign(Limits::quiet_NaN(), i % 2 == 0 ? T(1) : T(-1));
            }
        return random().value<T>();
    }
};

struct Mask {
    QorImageSize size;
    QorPoint2D anchor{};
    std::vector<uint8_t> bytes;

    bool has(int x, int y) const { return bytes[static_cast<size_t>(y * size.width + x)] != 0; }
    void set(int x, int y, bool isIn = true) {
        const int any = 1 + random().below(255);
        bytes[static_cast<size_t>(y * size.width + x)] = static_cast<uint8_t>(isIn ? any : 0);
    }
    int count() const {
        return static_cast<int>(std::count_if(bytes.begin(), bytes.end(), [](int b) { return b; }));
    }
    Around around() const { return Around::ofMask(size, anchor); }
};

/// A mask of the pixels that isIn(x, y) tells, or of one of them where it tells none.
inline Mask makeMask(QorImageSize size, QorPoint2D anchor, const std::function<bool(int, int)>& isIn) {
    Mask mask{size, anchor, std::vector<uint8_t>(static_cast<size_t>(size.width * size.height))};
    for (int y = 0; y < size.height; ++y)
        for (int x = 0; x < size.width; ++x) mask.set(x, y, isIn(x, y));
    if (mask.count() == 0) mask.set(random().below(size.width), random().below(size.height));
    return mask;
}

/// At the corners, in the middles of the edges, in the middle, or anywhere.
inline QorPoint2D drawAnchor(QorImageSize size) {
    const auto along = [](int length) {
        const int places[] = {0, length - 1, length / 2, random().below(length)};
        return places[random().below(4)];
    };
    return {along(size.width), along(size.height)};
}

/// Full rectangles, lines, rectangles and squares inside empty margins, crosses, frames, ellipses, rows of runs, noise
/// of any density: all that a mask can be taken for.
inline Mask drawMask(QorImageSize largest) {
    const QorImageSize size{1 + random().below(largest.width), 1 + random().below(largest.height)};
    const int w = size.width, h = size.height, x0 = random().below(w), y0 = random().below(h);
    const int x1 = x0 + 1 + random().below(w - x0), y1 = y0 + 1 + random().below(h - y0), density = random().below(9);
    const auto inside = [=](int x, int y) { return x >= x0 && x < x1 && y >= y0 && y < y1; };
    const std::function<bool(int, int)> makes[] = {
        [](int, int) { return true; },
        [=](int, int y) { return y == y0; },
        [=](int x, int) { return x == x0; },
        inside,
        [=](int x, int y) { return !inside(x, y); },
        [=](int x, int y) { return x == x0 || y == y0; },
        [=](int x, int y) { return x == 0 || y == 0 || x == w - 1 || y == h - 1; },
        [=](int x, int y) { return std::hypot((x + 0.5) / w - 0.5, (y + 0.5) / h - 0.5) <= 0.5; },
        [=](int x, int y) { return x == x0 && y == y0; },
        [=](int x, int y) { return x >= x0 && x < x0 + 3 && y >= y0 && y < y0 + 3; },
        [=](int x, int y) { return (x / (1 + density) + y) % 2 == 0; },
        [=](int, int) { return random().below(8) < density; },
    };
    return makeMask(size, drawAnchor(size), makes[random().below(std::size(makes))]);
}

/// What an erosion or dilation makes of pixel(dx, dy).
template <class T, bool largest, class Pixel>
T extremeUnder(const Mask& mask, Pixel pixel) {
    reference::Extreme<T, largest> extreme;
    for (int y = 0; y < mask.size.height; ++y)
        for (int x = 0; x < mask.size.width; ++x)
            if (mask.has(x, y)) extreme.meet(pixel(x - mask.anchor.x, y - mask.anchor.y));
    return extreme.value();
}

inline std::string describe(const Mask& mask) {
    std::string text = std::to_string(mask.size.width) + " x " + std::to_string(mask.size.height) + " anchor " +
                       std::to_string(mask.anchor.x) + ", " + std::to_string(mask.anchor.y);
    for (int y = 0; y < mask.size.height; ++y) {
        text += '\n';
        for (int x = 0; x < mask.size.width; ++x) text += mask.has(x, y) ? '#' : '.';
    }
    return text;
}

/// Regions of every width and some heights, narrower and lower than the windows too.
inline std::vector<Shape> extremeShapes() {
    std::vector<Shape> shapes = windowShapes(2);
    for (Shape tall : {Shape{.width = 1, .height = 40}, Shape{.width = 33, .height = 37, .padding = 3},
                       Shape{.width = 97, .height = 70, .atBegin = true}, Shape{.width = 5, .height = 29, .shift = 1}})
        shapes.push_back(tall);
    return shapes;
}

/// Wide enough for several tiles of columns, of float pixels of three and four channels.
constexpr Shape kTiled{.width = 2500, .height = 9, .padding = 7};
/// Work rows of any pixels as long as this many pages, or halves of them, lie further apart than they are long.
constexpr Shape kWholePages{.width = 2048, .height = 6};

}  // namespace qori::test
