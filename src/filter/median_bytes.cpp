// SPDX-License-Identifier: Apache-2.0
#include "median_bytes.h"

#include <algorithm>
#include <utility>

namespace qori::filter {
namespace {

using kernels::Thresholds;

/// Of every so many values, the last: a survey of where medians are.
constexpr int kBlock = 8;
constexpr Thresholds blockEnds() {
    Thresholds ends;
    for (int value = kBlock - 1; value < 256; value += kBlock) ends.at[ends.count++] = static_cast<int16_t>(value);
    return ends;
}

/// Thresholds that medians of given values take.
class Wanted {
public:
    void add(int value) {
        isIn_[value] = isIn_[value + 1] = true;  // the thresholds value - 1 and value
    }
    void addBlock(int block) {
        for (int k = 0; k < kBlock; ++k) add(block * kBlock + k);
    }
    int count() const { return static_cast<int>(std::count(isIn_, std::end(isIn_), true)); }
    /// So many, the others as near as possible.
    Thresholds nearest(int count) const {
        int distance[kAll], atDistance[kAll + 1] = {};
        for (int i = 0, to = kAll; i < kAll; ++i) distance[i] = to = isIn_[i] ? 0 : std::min(to + 1, kAll);
        for (int i = kAll - 1, to = kAll; i >= 0; --i)
            ++atDistance[distance[i] = std::min(distance[i], to = isIn_[i] ? 0 : std::min(to + 1, kAll))];
        int most = 0;
        while (count >= atDistance[most]) count -= atDistance[most++];
        Thresholds nearest;
        for (int i = 0; i < kAll; ++i)
            if (distance[i] < most || (distance[i] == most && count-- > 0))
                nearest.at[nearest.count++] = static_cast<int16_t>(i - 1);
        return nearest;
    }

private:
    static constexpr int kAll = 257;
    bool isIn_[kAll] = {};
};

}  // namespace

template <class Bins>
bool ByteWindows<Bins>::bandsSuffice(QorImageSize mask) {
    using Bands = kernels::ColumnBands<64>;
    if (!std::is_same_v<Bins, kernels::SmallBins>) return false;
    return mask.height <= Bands::kMostRows && int64_t{mask.width} * mask.height <= Bands::kMostElements;
}

template <class Bins>
int32_t ByteWindows<Bins>::columnsOf(QorImageSize size, QorImageSize mask) {
    // Counts stay in the first-level cache, unless the mask alone takes more.
    constexpr int kCache = 44 << 10;
    int64_t most = std::max(2 * int64_t{mask.width}, int64_t{kCache / Histograms::kColumnBytes});
    // Fewer columns of medians take fewer thresholds, but their windows' other columns cost more: 64, 96 and 128 are
    // alike from 17 x 17 on, but for flat images and noise, of which 128 take 0.85 to 0.9 of the time of 64.
    constexpr int32_t kMedians = 128;
    if (bandsSuffice(mask)) most = kMedians + mask.width - 1;
    return static_cast<int32_t>(std::min({int64_t{size.width} + mask.width - 1, most, int64_t{INT32_MAX}}));
}

template <class Bins>
ByteWindows<Bins>::ByteWindows(WorkBuffer& memory, int32_t columns, QorImageSize mask)
    : mask_(mask),
      counts_(memory.take<uint8_t>(bandsSuffice(mask) ? columns * kernels::ColumnBands<64>::kColumnBytes : 0)),
      table_(memory.take<uint8_t>(bandsSuffice(mask) ? kernels::ColumnBands<64>::kTableBytes : 0)),
      histogramMemory_(memory.take<uint8_t>(int64_t{columns} * Histograms::kColumnBytes)),
      bands16_(table_, counts_),
      bands32_(table_, counts_),
      bands64_(table_, counts_),
      histograms_(histogramMemory_) {}

template <class Bins>
void ByteWindows<Bins>::begin(const kernels::ByteRows& rows, int32_t columns, int32_t height) {
    // Thresholds are chosen in the time that histograms take for this many elements.
    constexpr int64_t kLeast = 1500;
    rows_ = rows;
    columns_ = columns;
    y_ = since_ = 0;
    const bool bands = bandsSuffice(mask_) && columns * (int64_t{mask_.height} + height) >= kLeast;
    method_ = bands ? Method::none : Method::histograms;
    until_ = bands ? 0 : INT64_MAX;
}

template <class Bins>
void ByteWindows<Bins>::makeRow(uint8_t* medians, Rest* rests) {
    if constexpr (std::is_same_v<Rest, uint16_t>) {
        if (!makeRowByBands(medians, rests)) makeRowByHistograms(medians, rests);
    } else {
        makeRowByHistograms(medians, rests);
    }
    ++y_;
}

template <class Bins>
void ByteWindows<Bins>::makeRowByHistograms(uint8_t* medians, Rest* rests) {
    if (y_ == since_)
        histograms_.begin(rows_, y_, columns_, mask_);
    else
        histograms_.advance(rows_.row(ptrdiff_t{y_} + mask_.height - 1), rows_.row(y_ - 1), rows_.apart);
    const auto below = static_cast<int32_t>(int64_t{mask_.width} * mask_.height / 2);
    if (rests == nullptr)
        histograms_.medians(
            below, [=](int32_t x, int byte, int32_t)
                       __attribute__((always_inline)) { medians[x] = static_cast<uint8_t>(byte); });
    else
        histograms_.medians(
            below, [=](int32_t x, int byte, int32_t rest) __attribute__((always_inline)) {
                medians[x] = static_cast<uint8_t>(byte);
                rests[x] = static_cast<Rest>(rest);
            });
}

// --- few thresholds -------------------------------------------------------------------------------------------------

template <class Bins>
template <class Bands>
bool ByteWindows<Bins>::start(Bands& bands, const Thresholds& thresholds, uint8_t* medians, uint16_t* rests) {
    bands.setValues(thresholds);
    bands.build(rows_, y_, columns_, mask_.height);
    return bands.medians(columns_, mask_.width, mask_.width * mask_.height / 2, medians, rests);
}

template <class Bins>
template <class Bands>
bool ByteWindows<Bins>::goOn(Bands& bands, uint8_t* medians, uint16_t* rests) {
    bands.advance(rows_.row(ptrdiff_t{y_} + mask_.height - 1), rows_.row(y_ - 1), rows_.apart, columns_);
    return bands.medians(columns_, mask_.width, mask_.width * mask_.height / 2, medians, rests);
}

/// False where the row is one for histograms.
template <class Bins>
bool ByteWindows<Bins>::makeRowByBands(uint8_t* medians, uint16_t* rests) {
    if (method_ == Method::histograms && y_ < until_) return false;
    Method least = Method::bands16;
    if (y_ < until_) {
        const bool found = method_ == Method::bands16   ? goOn(bands16_, medians, rests)
                           : method_ == Method::bands32 ? goOn(bands32_, medians, rests)
                                                        : goOn(bands64_, medians, rests);
        if (found) return true;
        // To count anew is as much work as half of the mask's rows.
        if (y_ - since_ < mask_.height) least = static_cast<Method>(static_cast<int>(method_) + 1);
    }
    Wanted wanted;
    if (least != Method::histograms) {
        bands32_.setNumbers(blockEnds());
        bands32_.build(rows_, y_, columns_, mask_.height);
        (void)bands32_.medians(columns_, mask_.width, mask_.width * mask_.height / 2, medians, nullptr);
        bool isMet[256 / kBlock] = {};
        for (int32_t x = 0; x <= columns_ - mask_.width; ++x) isMet[medians[x]] = true;
        for (int block = 0; block < 256 / kBlock; ++block)
            if (isMet[block]) wanted.addBlock(block);
    }
    since_ = y_;
    method_ = std::max(least, methodFor(wanted.count()));
    until_ = method_ == Method::bands16 ? INT64_MAX : int64_t{y_} + 8 * mask_.height + 64;
    switch (method_) {
        case Method::bands16: (void)start(bands16_, wanted.nearest(16), medians, rests); break;
        case Method::bands32: (void)start(bands32_, wanted.nearest(32), medians, rests); break;
        case Method::bands64: (void)start(bands64_, wanted.nearest(64), medians, rests); break;
        default: return false;
    }
    // Blocks are coarse; by the values themselves, fewer thresholds may do.
    if (least == Method::bands16 && method_ != Method::bands16) {
        Wanted met;
        for (int32_t x = 0; x <= columns_ - mask_.width; ++x) met.add(medians[x]);
        const int withMargin = met.count() * 4 / 3;
        if (withMargin <= 16) {
            method_ = Method::bands16;
            (void)start(bands16_, met.nearest(16), medians, rests);
        } else if (withMargin <= 32 && method_ == Method::bands64) {
            method_ = Method::bands32;
            (void)start(bands32_, met.nearest(32), medians, rests);
        }
    }
    return true;
}

template class ByteWindows<kernels::SmallBins>;
template class ByteWindows<kernels::LargeBins>;

}  // namespace qori::filter
