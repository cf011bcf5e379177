// SPDX-License-Identifier: Apache-2.0
// Medians of bytes from counts of few thresholds. Where windows are large their medians differ little along a row, so
// that column histograms need not know all values: of every column it is counted how many elements are up to each of
// 16 or 32 thresholds, those around the medians. Sums over the columns of a window follow it from pixel to pixel; a
// median is the first threshold up to which there are more than half, if the threshold before is one less. Otherwise
// it is not among them, which is said, and they have to be chosen anew. No branch depends on the elements.
#pragma once
#include "byte_rows.h"
#include "kernels/simd.h"

namespace qori::kernels {

/// Ascending; -1 stands before the value 0.
struct Thresholds {
    static constexpr int kMost = 32;
    int16_t at[kMost];
    int count = 0;
};

template <int lanes>
class ColumnBands {
public:
    /// Of windows: sums are signed words, differences of columns signed bytes.
    static constexpr int32_t kMostRows = 127, kMostElements = 32767;
    static constexpr int kTableBytes = 256 * lanes, kColumnBytes = lanes;

    /// kTableBytes and kColumnBytes for each column, on 32-byte boundaries.
    ColumnBands(uint8_t* table, uint8_t* counts) : table_(table), counts_(counts) {}

    /// Up to `lanes` of them. Medians are named by their values ...
    void setValues(const Thresholds& thresholds);
    /// ... or by the number of the threshold, which all have then.
    void setNumbers(const Thresholds& thresholds);

    /// Counts what windows of `height` rows see, from row y on.
    void build(const ByteRows& rows, int32_t y, int32_t columns, int32_t height);
    /// The lowest row, and the one that went out of sight.
    void advance(const uint8_t* entering, const uint8_t* leaving, ptrdiff_t apart, int32_t columns);
    /// Of windows of `width` columns, the bytes with at most `below` elements before them, and, unless rests is null,
    /// how many of the elements equal to it come before the median. False if some are not among the thresholds; what
    /// is written for them is of no use.
    bool medians(int32_t columns, int32_t width, int32_t below, uint8_t* to, uint16_t* rests) const;

private:
    static constexpr uint16_t kMissed = 0x100;

    void setTable(const Thresholds& thresholds);
    template <bool wantsRests>
    bool find(int32_t columns, int32_t width, int32_t below, uint8_t* to, uint16_t* rests) const;

    uint8_t *table_, *counts_;     // table_: of each byte, -1 in lanes of thresholds that count it
    uint16_t name_[lanes + 1];     // by how many thresholds count more than `below`
    uint8_t previous_[lanes + 1];  // where the sum of the threshold before is stored
};

extern template class ColumnBands<16>;
extern template class ColumnBands<32>;

}  // namespace qori::kernels
