// SPDX-License-Identifier: Apache-2.0
#include "median_bytes.h"

#include <algorithm>

namespace qori::filter {

template <class Histograms>
int32_t ByteWindows<Histograms>::columnsOf(QorImageSize size, QorImageSize mask) {
    int64_t most;
    if constexpr (kIsSmall) {
        // Of 128, 192 and 256 medians the most are the fastest: rows take time to begin, and windows' other columns
        // cost as much as those of medians, more than it costs that counts are in the second-level cache.
        constexpr int32_t kMedians = 256;
        most = int64_t{std::max(kMedians, mask.width)} + mask.width - 1;
    } else {
        // Counts stay in the first-level cache, unless the mask alone takes more.
        constexpr int kCache = 44 << 10;
        most = std::max(2 * int64_t{mask.width}, int64_t{kCache / Histograms::kColumnBytes});
    }
    return static_cast<int32_t>(std::min({int64_t{size.width} + mask.width - 1, most, int64_t{INT32_MAX}}));
}

template <class Histograms>
ByteWindows<Histograms>::ByteWindows(WorkBuffer& memory, int32_t columns, QorImageSize mask)
    : mask_(mask),
      thresholdMemory_(
          memory.take<uint8_t>(thresholdsSuffice(mask) ? kernels::TileThresholds::bytes(columns, mask) : 0)),
      histogramMemory_(memory.take<uint8_t>(Histograms::bytes(columns))),
      thresholds_(thresholdMemory_),
      histograms_(histogramMemory_) {}

template <class Histograms>
void ByteWindows<Histograms>::begin(const kernels::ByteRows& rows, int32_t columns) {
    rows_ = rows;
    columns_ = columns;
    y_ = since_ = timesFew_ = 0;
    byThresholds_ = thresholdsSuffice(mask_) && medians() <= kernels::TileThresholds::kMostMedians;
    histograms_.begin(rows, columns, mask_);
}

template <class Histograms>
void ByteWindows<Histograms>::makeRow(uint8_t* medians, Rest* rests) {
    if constexpr (kIsSmall) {
        if (!byThresholds_ || !makeRowByThresholds(medians, rests)) makeRowByHistograms(medians, rests);
    } else {
        makeRowByHistograms(medians, rests);
    }
    ++y_;
}

/// False where the row is one for histograms, as others will be for a while.
template <class Histograms>
bool ByteWindows<Histograms>::makeRowByThresholds(
    uint8_t* to, uint16_t* rests) requires std::is_same_v<Histograms, kernels::ColumnParts> {
    if (y_ == since_)
        thresholds_.begin(rows_, y_, columns_, mask_);
    else
        thresholds_.advance(rows_.row(ptrdiff_t{y_} + mask_.height - 1), rows_.apart);
    if (thresholds_.medians(to, rests)) return true;
    byThresholds_ = false;
    since_ = y_;
    timesFew_ = 0;
    return false;
}

template <class Histograms>
void ByteWindows<Histograms>::makeRowByHistograms(uint8_t* to, Rest* rests) {
    y_ == since_ ? histograms_.build(y_, 0, columns_) : histograms_.advance(y_, 0, columns_);
    const auto below = static_cast<int32_t>(int64_t{mask_.width} * mask_.height / 2);
    histograms_.medians(0, medians(), below, to, rests);
    // To change takes as long as many rows.
    constexpr int32_t kRowsToLook = 16;
    constexpr int kTimes = 3;
    if (!thresholdsSuffice(mask_) || y_ % kRowsToLook != 0) return;
    timesFew_ = kernels::TileThresholds::areFew(to, medians()) ? timesFew_ + 1 : 0;
    byThresholds_ = timesFew_ == kTimes;
    if (byThresholds_) since_ = y_ + 1;
}

template class ByteWindows<kernels::ColumnParts>;
template class ByteWindows<kernels::ColumnHistograms>;

}  // namespace qori::filter
