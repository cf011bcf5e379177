// SPDX-License-Identifier: Apache-2.0
// Medians of bytes from counts of few thresholds. Medians of large windows differ little from pixel to pixel, so that
// tiles of 32 pixels of a row follow the thresholds alone that the tile's medians are between: for each, how many
// elements of each pixel's window are below it. Lanes are pixels. From a row to the next a count changes by what enters
// below the threshold less what leaves: along a tile, sums of differences at either side of the window. A median is the
// highest value that no more than half of the elements are below: where that and the next one are not among the
// thresholds, more are counted.
#pragma once
#include <algorithm>

#include "byte_rows.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels {

class TileThresholds {
public:
    static constexpr int32_t kMostMedians = 256;

    /// Changes of a window's count from row to row are signed bytes, counts of columns bytes, those of a window words.
    static bool suffice(QorImageSize window) {
        return window.width <= 127 && window.height <= 255 && window.width * window.height <= UINT16_MAX;
    }
    static int64_t bytes(int32_t columns, QorImageSize window) {
        const int64_t tiles = tilesOf(columns - window.width + 1);
        return tiles * kValues * kCountBytes + (int64_t{window.height} + 1) * pitchOf(columns);
    }

    /// Memory of bytes(columns, window), on a 32-byte boundary.
    explicit TileThresholds(uint8_t* memory) : counts_(memory) {}

    /// The windows of row y come into sight, of kMostMedians medians or fewer.
    void begin(const ByteRows& rows, int32_t y, int32_t columns, QorImageSize window);
    /// The lowest row. The one that goes out of sight is known.
    void advance(const uint8_t* entering, ptrdiff_t apart);
    /// Medians of the row's windows, once for each row, and, unless rests is null, how many of the elements equal to it
    /// come before the median. False if that takes too many thresholds, or took too long for some rows: then medians
    /// are missing, and it has to begin anew.
    bool medians(uint8_t* to, uint16_t* rests);

    /// Whether medians like those of a row take few thresholds.
    static bool areFew(const uint8_t* medians, int32_t count);

private:
    static constexpr int kTile = kVectorBytes, kValues = 256, kCountBytes = 2 * kTile;

    static constexpr int kMost = 64;

    /// A tile's thresholds, in no order.
    struct Tile {
        int count;
        uint8_t at[kMost];

        bool isIn(int threshold) const { return std::find(at, at + count, threshold) != at + count; }
    };
    /// What the pixels' medians are between: they reach the highest threshold of `from`, 0 if none, and not the lowest
    /// `to`, 255 if none. In the order in which words are packed; thresholds less 128.
    struct Between {
        __m256i from, to;
        void narrow(__m256i even, __m256i odd, __m256i threshold);
    };

    static int32_t tilesOf(int32_t medians) { return (medians + kTile - 1) / kTile; }
    /// A column before the first one, and whole vectors behind the last tile's windows.
    static ptrdiff_t pitchOf(int32_t columns) { return (ptrdiff_t{columns} + 1 + 3 * kTile) / kTile * kTile; }

    uint8_t* countsOf(int32_t tile, int threshold) const {
        return counts_ + (ptrdiff_t{tile} * kValues + threshold) * kCountBytes;
    }
    uint8_t* row(int32_t slot) const { return rows_ + ptrdiff_t{slot} * pitch_; }
    int32_t next(int32_t slot) const { return slot == window_.height ? 0 : slot + 1; }
    void read(const uint8_t* from, ptrdiff_t apart, uint8_t* to) const;
    void add(int32_t tile, int threshold, Between& medians);
    int inside(int32_t tile, int pixel, int from, int to, bool middle) const;
    int32_t countAt(int32_t tile, int threshold, int pixel) const;
    template <int vectors>
    QORI_NOINLINE Between step(int32_t tile) const;
    Between stepped(int32_t tile) const;
    bool search(int32_t tile, Between& medians);
    bool makeTile(int32_t tile, uint8_t* to, uint16_t* rests);
    static void leaveOut(Tile& tile, const uint8_t* medians, int32_t count);

    uint8_t *counts_, *rows_ = nullptr;
    int32_t columns_ = 0, half_ = 0, since_ = 0;
    QorImageSize window_{};
    ptrdiff_t pitch_ = 0;
    int32_t top_ = 0, left_ = 0, lowest_ = 0;  ///< Slots of rows: in sight from top_ to lowest_; left_ is out of sight.
    int used_ = 0;                             ///< Thresholds of all tiles.
    int32_t work_ = 0;                         ///< Since thresholds were left out, in cycles.
    Tile tiles_[kMostMedians / kTile] = {};
};

}  // namespace qori::kernels
