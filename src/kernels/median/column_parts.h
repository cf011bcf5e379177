// SPDX-License-Identifier: Apache-2.0
// Medians of bytes by histograms of columns, at a cost that hardly grows with the window (Perreault and Hebert: Median
// filtering in constant time, 2007). Values fall into nine parts of 31: part k begins at 31 k - 12, so that the middle
// of the range is not the edge of one. Of what the windows of a row see of each column are counted the elements below
// each part, and within each part those up to each of its values. The former lie by rows of columns and are compared as
// vectors, the latter by parts and columns. A window is followed from pixel to pixel by the counts up to the values of
// the part that its median is in, as words; where the median leaves it, the counts of another part are summed up anew.
// A part is left about once in thirty pixels of photographs.
#pragma once
#include "byte_rows.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels {

/// Of a window, for the places of a part: how many elements are up to a place's value, less those that come before the
/// median, less one, so that places before the median are negative. The first place is what is below the part. Places
/// with even numbers, and with odd ones.
struct PartSums {
    __m256i even, odd;
};

class ColumnParts {
public:
    using Rest = uint16_t;
    /// Ranges of columns begin at multiples of it.
    static constexpr int32_t kBlock = kVectorBytes;

    /// Counts of a column are bytes, those of a window words.
    static bool suffice(int64_t width, int64_t height) { return height <= 255 && width * height <= UINT16_MAX; }
    static int64_t bytes(int32_t columns) { return paddedOf(columns) * (kParts * (kPlaces + 2) + 4); }

    /// Memory of bytes(columns), on a 32-byte boundary.
    explicit ColumnParts(uint8_t* memory) : memory_(memory) {}

    /// Of so many columns, none of them counted yet.
    void begin(const ByteRows& rows, int32_t columns, QorImageSize window);
    /// Counts what the windows of row y see of the columns.
    void build(int32_t y, int32_t from, int32_t to);
    /// The windows of row y come into sight, those of the row above go, of columns that are counted.
    void advance(int32_t y, int32_t from, int32_t to);
    /// Medians of the row's windows first to end - 1: bytes with at most `below` elements before them, and, unless
    /// rests is null, how many of the elements equal to it come before the median.
    void medians(int32_t first, int32_t end, int32_t below, uint8_t* to, uint16_t* rests);

private:
    static constexpr int kParts = 9, kPlaces = 32, kValues = kPlaces - 1, kBefore = 12;

    /// The counts of the window at x within a part.
    struct Window {
        PartSums sums;
        int32_t x;
        int part;
    };
    /// A row's elements: their parts, and the places within, those whose counts do not change.
    struct Entries {
        uint8_t *part, *place;
    };
    struct Entry {
        __m256i part, place;
    };

    /// Whole vectors, which may begin at any column.
    static int64_t paddedOf(int32_t columns) { return (int64_t{columns} + 31) / 32 * 32 + 32; }
    static Entry split(__m256i values);

    const uint8_t* within(int part, int32_t x) const { return within_ + part * plane_ + ptrdiff_t{x} * kPlaces; }
    uint8_t* beneath(int part) const { return beneath_ + part * padded_; }
    const uint8_t* elements(int32_t y, int32_t from, int32_t to, uint8_t* gathered) const;
    static Bytes some(const uint8_t* elements, ptrdiff_t x, ptrdiff_t end);
    void enter(int32_t y, int32_t from, int32_t to);
    template <bool isTall>
    const uint8_t* beside(int part, int32_t end);
    template <bool isTall, bool wantsRests>
    void follow(int32_t first, int32_t end, int32_t below, uint8_t* to, uint16_t* rests);
    int32_t before(int part, int32_t x) const;
    int partOf(int32_t x, int32_t below) const;
    QORI_INLINE PartSums summedUp(int32_t x, int part) const;
    QORI_NOINLINE void leave(Window& now, int32_t below) const;

    uint8_t* memory_;
    uint8_t *within_ = nullptr, *beneath_ = nullptr, *differences_ = nullptr;
    Entries in_{}, out_{};
    ByteRows rows_{};
    int32_t columns_ = 0, width_ = 0, height_ = 0;
    ptrdiff_t padded_ = 0, plane_ = 0;
    int32_t from_ = 0;        ///< Differences are those of windows from here on ...
    unsigned fresh_ = 0;      ///< ... of these parts.
    uint8_t hints_[16] = {};  ///< The parts that the first medians of the row before were in, or any.
};

}  // namespace qori::kernels
