// SPDX-License-Identifier: Apache-2.0
// Medians of bytes of any mask, row after row of a strip of columns: by counts of few thresholds while the medians of a
// row are near each other or take few values, else by whole histograms.
#pragma once
#include "frame/plan.h"
#include "kernels/median/bands.h"
#include "kernels/median/column_parts.h"
#include "kernels/median/histograms.h"

namespace qori::filter {

template <class Histograms>
class ByteWindows {
public:
    using Rest = typename Histograms::Rest;

    /// Columns of strips that pay, at most.
    static int32_t columnsOf(QorImageSize size, QorImageSize mask);

    ByteWindows(WorkBuffer& memory, int32_t columns, QorImageSize mask);

    /// Another strip, of so many columns or fewer, of which so many rows of medians will be made.
    void begin(const kernels::ByteRows& rows, int32_t columns, int32_t height);
    /// The next row of medians, from row 0; rests: how many of the window's elements equal to each come before it, or
    /// null.
    void makeRow(uint8_t* medians, Rest* rests);

private:
    static constexpr bool kIsSmall = std::is_same_v<Histograms, kernels::ColumnParts>;
    enum class Method { none, bands16, bands32, histograms };

    static bool bandsSuffice(QorImageSize mask);
    static Method methodFor(int thresholds) {
        return thresholds <= 16 ? Method::bands16 : thresholds <= 32 ? Method::bands32 : Method::histograms;
    }
    bool makeRowByBands(uint8_t* medians, uint16_t* rests);
    void makeRowByHistograms(uint8_t* medians, Rest* rests);
    template <class Bands>
    bool start(Bands& bands, const kernels::Thresholds& thresholds, uint8_t* medians, uint16_t* rests);
    template <class Bands>
    bool goOn(Bands& bands, uint8_t* medians, uint16_t* rests);

    QorImageSize mask_;
    uint8_t *counts_, *table_, *histogramMemory_;
    kernels::ByteRows rows_{};
    int32_t columns_ = 0, y_ = 0;
    Method method_ = Method::none;
    int32_t since_ = 0;  ///< The method's first row ...
    int64_t until_ = 0;  ///< ... and the one at which others are thought of.
    kernels::ColumnBands<16> bands16_;
    kernels::ColumnBands<32> bands32_;
    Histograms histograms_;
};

extern template class ByteWindows<kernels::ColumnParts>;
extern template class ByteWindows<kernels::ColumnHistograms>;

}  // namespace qori::filter
