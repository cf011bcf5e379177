// SPDX-License-Identifier: Apache-2.0
// How the extreme of an arbitrary window is put together. Elements may be met twice and in any order, so a window is
// covered, not divided: by a few rectangles, each of which costs the same at any size, or by taps, each of which joins
// one pixel, or 2, 4, 8 ... of them along a row that have been joined before. Whichever costs least is taken.
#pragma once
#include "image/image.h"

namespace qori::filter {

/// Pixels that take part, relative to the one that is made.
struct Window {
    const uint8_t* bytes;  ///< Those that are not zero, row by row; all of the size where null.
    QorImageSize size;
    QorPoint2D anchor;

    bool has(int32_t x, int32_t y) const {
        return bytes == nullptr || bytes[static_cast<ptrdiff_t>(int64_t{y} * size.width) + x] != 0;
    }
};

/// 2^level pixels from (x, y) on, relative to the pixel that is made.
struct Tap {
    int32_t level, x, y;
};

inline constexpr int32_t floorLog2(int32_t n) { return 31 - __builtin_clz(static_cast<uint32_t>(n)); }

struct WindowCover {
    static constexpr int kMostRects = 6;

    QorImageRect box{};               ///< Around all pixels that take part, relative to the one that is made.
    int rects = 0;                    ///< 0 where taps make the window.
    QorImageRect rect[kMostRects]{};  ///< Relative to the pixel that is made.
    int32_t levels = 0;               ///< The highest level among the taps.
    int64_t taps = 0;

    bool isOnePixel() const { return rects == 0 && taps == 1; }
    int32_t lastRow() const { return box.y + box.height - 1; }
};

/// Calls visit(x, y, length) for each run of pixels that take part, in the mask's coordinates.
template <class Visit>
void forEachRun(const Window& window, Visit visit) {
    for (int32_t y = 0; y < window.size.height; ++y)
        for (int32_t x = 0; x < window.size.width;) {
            const int32_t begin = x;
            if (window.bytes == nullptr) x = window.size.width;
            while (x < window.size.width && window.has(x, y)) ++x;
            if (x > begin) visit(begin, y, x - begin);
            if (x < window.size.width) ++x;
        }
}

/// Calls visit(Tap) for each tap; with levels a run takes one or two, which overlap.
template <class Visit>
void forEachTap(const Window& window, bool usesLevels, Visit visit) {
    forEachRun(window, [&](int32_t x, int32_t y, int32_t length) {
        const QorPoint2D at{x - window.anchor.x, y - window.anchor.y};
        if (!usesLevels) {
            for (int32_t i = 0; i < length; ++i) visit(Tap{0, at.x + i, at.y});
            return;
        }
        const int32_t level = floorLog2(length), beyond = length - (1 << level);
        visit(Tap{level, at.x, at.y});
        if (beyond > 0) visit(Tap{level, at.x + beyond, at.y});
    });
}

/// The window has a pixel. One without a mask and of any size takes no time to speak of.
WindowCover coverOf(const Window& window);

/// How rows are joined with themselves until each element is the extreme of a number of pixels: in rounds that double
/// it, all of them in one pass, and in passes each of which widens what the one before joined by the radix.
struct Widening {
    static constexpr int32_t kMostRadix = 8;  ///< Beyond it, two passes cost less than one.

    int32_t radix, rounds;

    static Widening to(int32_t width, int pixelBytes);
};

}  // namespace qori::filter
