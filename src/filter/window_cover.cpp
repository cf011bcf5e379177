// SPDX-License-Identifier: Apache-2.0
#include "window_cover.h"

#include <algorithm>

#include "kernels/morphology/joins.h"

namespace qori::filter {
namespace {

/// Costs are in vector loads; a store counts as one and a half.
constexpr double kStore = 1.5;
/// A rectangle of several rows: joining what enters, joining a block of rows backwards, the two taps of the result.
constexpr double kRunning = 2 + kStore + 2 + kStore + 2;
/// A level: a row joined with itself.
constexpr double kLevel = 2 + kStore;
/// A pass of rounds, whose blocks of 16 bytes are loaded and stored alone; a round.
constexpr double kRounds = 1.5 + kStore + 1, kRound = 0.5;

double widenedCost(Widening widening, int32_t width) {
    double cost = widening.rounds > 0 ? kRounds + kRound * widening.rounds : 0;
    for (int64_t has = int64_t{1} << widening.rounds, next = 0; next < width || next == 0; has = next) {
        next = std::min<int64_t>(has * widening.radix, width);
        const int64_t taps = (next - 1) / has + 1;
        cost += static_cast<double>(taps) + kStore;
        if (next == width) break;
    }
    return cost;
}

double costOf(const QorImageRect& rect) {
    return widenedCost(Widening::to(rect.width, 1), rect.width) + (rect.height > 1 ? kRunning : 1);
}

bool isFull(const Window& window, int32_t x, int32_t y, int32_t length) {
    for (int32_t i = 0; i < length; ++i)
        if (!window.has(x + i, y)) return false;
    return true;
}

bool contains(const QorImageRect& rect, int32_t x, int32_t y, int32_t length) {
    return y >= rect.y && y < rect.y + rect.height && x >= rect.x && x + length <= rect.x + rect.width;
}

/// Grows a run up and down as far as the mask has all of it.
QorImageRect grown(const Window& window, int32_t x, int32_t y, int32_t length) {
    if (window.bytes == nullptr) return {0, 0, window.size.width, window.size.height};
    int32_t top = y, end = y + 1;
    while (top > 0 && isFull(window, x, top - 1, length)) --top;
    while (end < window.size.height && isFull(window, x, end, length)) ++end;
    return {x, top, length, end - top};
}

struct Survey {
    int32_t left = INT32_MAX, top = INT32_MAX, right = 0, bottom = 0;
    int64_t pixels = 0, taps = 0;
    int32_t levels = 0;
    QorImageRect rect[WindowCover::kMostRects]{};
    int rects = 0;
    bool rectsSuffice = true;

    void meet(const Window& window, int32_t x, int32_t y, int32_t length) {
        left = std::min(left, x);
        right = std::max(right, x + length);
        top = std::min(top, y);
        bottom = y + 1;
        pixels += length;
        const int32_t level = floorLog2(length);
        levels = std::max(levels, level);
        taps += length == 1 << level ? 1 : 2;
        cover(window, x, y, length);
    }

    void cover(const Window& window, int32_t x, int32_t y, int32_t length) {
        if (!rectsSuffice) return;
        for (int i = 0; i < rects; ++i)
            if (contains(rect[i], x, y, length)) return;
        rectsSuffice = rects < WindowCover::kMostRects;
        if (rectsSuffice) rect[rects++] = grown(window, x, y, length);
    }
};

Survey survey(const Window& window) {
    Survey found;
    if (window.bytes != nullptr) {
        forEachRun(window, [&](int32_t x, int32_t y, int32_t length) { found.meet(window, x, y, length); });
        return found;
    }
    found.meet(window, 0, 0, window.size.width);
    found.bottom = window.size.height;
    found.pixels *= window.size.height;
    found.taps *= window.size.height;
    return found;
}

}  // namespace

Widening Widening::to(int32_t width, int pixelBytes) {
    constexpr int32_t kDirect = 7;  // taps that cost less than any pass before them
    if (width <= kDirect) return {kMostRadix, 0};
    const int32_t rounds = std::min(kernels::mostRounds(pixelBytes), floorLog2(width - 1));
    const int64_t taps = ((int64_t{width} - 1) >> rounds) + 1;
    // The least radix of as few passes as the largest would take.
    int32_t radix = 2, passes = 1;
    for (int64_t reach = kMostRadix; reach < taps; reach *= kMostRadix) ++passes;
    const auto reach = [&] {
        int64_t product = 1;
        for (int32_t k = 0; k < passes; ++k) product *= radix;
        return product;
    };
    while (reach() < taps) ++radix;
    return {radix, rounds};
}

WindowCover coverOf(const Window& window) {
    const Survey found = survey(window);
    WindowCover cover;
    cover.box = {found.left - window.anchor.x, found.top - window.anchor.y, found.right - found.left,
                 found.bottom - found.top};
    double rectsCost = 0;
    for (int i = 0; i < found.rects; ++i) rectsCost += costOf(found.rect[i]);
    const auto direct = static_cast<double>(found.pixels);
    const double leveled = static_cast<double>(found.taps) + found.levels * kLevel;
    if (found.rectsSuffice && rectsCost < std::min(direct, leveled)) {
        cover.rects = found.rects;
        for (int i = 0; i < found.rects; ++i) {
            cover.rect[i] = found.rect[i];
            cover.rect[i].x -= window.anchor.x;
            cover.rect[i].y -= window.anchor.y;
        }
        return cover;
    }
    cover.levels = leveled < direct ? found.levels : 0;
    cover.taps = leveled < direct ? found.taps : found.pixels;
    return cover;
}

}  // namespace qori::filter
