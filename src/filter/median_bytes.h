// SPDX-License-Identifier: Apache-2.0
// Medians of bytes of any mask, row after row of a strip of columns: by counts of few thresholds while medians near
// each other take few values, else by whole histograms.
#pragma once
#include <type_traits>

#include "frame/plan.h"
#include "kernels/median/column_parts.h"
#include "kernels/median/histograms.h"
#include "kernels/median/tile_thresholds.h"

namespace qori::filter {

template <class Histograms>
class ByteWindows {
public:
    using Rest = typename Histograms::Rest;

    /// Columns of strips that pay, at most.
    static int32_t columnsOf(QorImageSize size, QorImageSize mask);

    ByteWindows(WorkBuffer& memory, int32_t columns, QorImageSize mask);

    /// Another strip, of so many columns or fewer.
    void begin(const kernels::ByteRows& rows, int32_t columns);
    /// The next row of medians, from row 0; rests: how many of the window's elements equal to each come before it, or
    /// null.
    void makeRow(uint8_t* medians, Rest* rests);

private:
    static constexpr bool kIsSmall = std::is_same_v<Histograms, kernels::ColumnParts>;

    int32_t medians() const { return columns_ - mask_.width + 1; }
    static bool thresholdsSuffice(QorImageSize mask) { return kIsSmall && kernels::TileThresholds::suffice(mask); }
    bool makeRowByThresholds(uint8_t* medians,
                             uint16_t* rests) requires std::is_same_v<Histograms, kernels::ColumnParts>;
    void makeRowByHistograms(uint8_t* medians, Rest* rests);

    QorImageSize mask_;
    uint8_t *thresholdMemory_, *histogramMemory_;
    kernels::ByteRows rows_{};
    int32_t columns_ = 0, y_ = 0;
    bool byThresholds_ = false;
    int32_t since_ = 0;  ///< The first row by thresholds, or by histograms.
    int timesFew_ = 0;   ///< That a row by histograms was found to take few thresholds.
    kernels::TileThresholds thresholds_;
    Histograms histograms_;
};

extern template class ByteWindows<kernels::ColumnParts>;
extern template class ByteWindows<kernels::ColumnHistograms>;

}  // namespace qori::filter
