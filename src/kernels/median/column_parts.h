// SPDX-License-Identifier: Apache-2.0
// Medians of bytes by histograms of columns, at a cost that hardly grows with the window (Perreault and Hebert: Median
// filtering in constant time, 2007). Values fall into nine parts: part k begins at 32 k - 16, so that the middle of the
// range is not the edge of one. Of what the windows of a row see of each column are counted the elements below each
// part, and within each part those up to each of its values. The former lie by rows of columns and are compared as
// vectors, the latter by columns. A window is followed from pixel to pixel by the counts within the part that its
// median is in, as words, and by how many elements come before the part; where the median leaves it, the counts within
// another one are summed up anew. A part is left about once in thirty pixels of photographs.
#pragma once
#include "byte_rows.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels {

/// Counts within a part, of a window: bins 0 to 7 and 16 to 23 are in low, the others in high.
struct PartSums {
    __m256i low, high;
};

class ColumnParts {
public:
    using Rest = uint16_t;

    /// Counts of a column are bytes, those of a window words.
    static bool suffice(int64_t width, int64_t height) { return height <= 255 && width * height <= UINT16_MAX; }
    static int64_t bytes(int32_t columns) { return paddedOf(columns) * (kApart + kParts + 2 * kEntryBytes); }

    /// Memory of bytes(columns), on a 32-byte boundary.
    explicit ColumnParts(uint8_t* memory) : memory_(memory) {}

    /// The windows of row y of so many columns come into sight.
    void begin(const ByteRows& rows, int32_t y, int32_t columns, QorImageSize window);
    /// The lowest row, and the one that went out of sight.
    void advance(const uint8_t* entering, const uint8_t* leaving, ptrdiff_t apart);
    /// Medians of the row's windows: bytes with at most `below` elements before them, and, unless rests is null, how
    /// many of the elements equal to it come before the median.
    void medians(int32_t below, uint8_t* to, uint16_t* rests) const;

private:
    static constexpr int kParts = 9, kBins = 32, kApart = kParts * kBins, kEntryBytes = 1 + 2 * int{sizeof(uint16_t)};

    /// The counts within a part, of the window at x, and the median's place among them.
    struct Window {
        PartSums counts;
        int32_t x;
        int part;
        int32_t rest;
    };
    /// A row's elements: 16 times the part, where its counts begin within a column's, and the bytes of kSteps before
    /// what an element adds to them.
    struct Entries {
        uint8_t* part;
        uint16_t *counts, *steps;
    };

    /// Whole vectors, which may begin at any column.
    static int64_t paddedOf(int32_t columns) { return (int64_t{columns} + 31) / 32 * 32 + 32; }

    const uint8_t* within(int part, int32_t x) const { return within_ + ptrdiff_t{x} * kApart + part * kBins; }
    uint8_t* beneath(int part) const { return beneath_ + part * padded_; }
    void split(const uint8_t* row, ptrdiff_t apart, Entries to) const;
    void enter(const uint8_t* row, ptrdiff_t apart);
    template <bool isTall, bool wantsRests>
    void follow(int32_t below, uint8_t* to, uint16_t* rests) const;
    int32_t before(int part, int32_t x) const;
    int partOf(int32_t x, int32_t below) const;
    template <bool isTall>
    QORI_INLINE PartSums summedUp(int32_t x, int part) const;
    template <bool isTall>
    QORI_INLINE PartSums countsOf(const Window& left, int32_t x, int part) const;
    template <bool isTall>
    QORI_NOINLINE void leave(Window& now, Window& left, int32_t below) const;

    uint8_t* memory_;
    uint8_t *within_ = nullptr, *beneath_ = nullptr;
    Entries in_{}, out_{};
    int32_t columns_ = 0, width_ = 0, height_ = 0;
    ptrdiff_t padded_ = 0, step_ = 0;
    mutable int first_ = kParts / 2;  ///< The part that the first median of the row before was in, or any.
};

}  // namespace qori::kernels
