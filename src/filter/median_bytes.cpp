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

template <class Histograms>
bool ByteWindows<Histograms>::bandsSuffice(QorImageSize mask) {
    using Bands = kernels::ColumnBands<32>;
    return kIsSmall && mask.height <= Bands::kMostRows && int64_t{mask.width} * mask.height <= Bands::kMostElements;
}

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
      counts_(memory.take<uint8_t>(bandsSuffice(mask) ? columns * kernels::ColumnBands<32>::kColumnBytes : 0)),
      table_(memory.take<uint8_t>(bandsSuffice(mask) ? kernels::ColumnBands<32>::kTableBytes : 0)),
      histogramMemory_(memory.take<uint8_t>(Histograms::bytes(columns))),
      bands16_(table_, counts_),
      bands32_(table_, counts_),
      histograms_(histogramMemory_) {}

template <class Histograms>
void ByteWindows<Histograms>::begin(const kernels::ByteRows& rows, int32_t columns, int32_t height) {
    // Thresholds are chosen in the time that histograms take for this many elements.
    constexpr int64_t kLeast = 1500;
    rows_ = rows;
    columns_ = columns;
    y_ = since_ = 0;
    const bool bands = bandsSuffice(mask_) && columns * (int64_t{mask_.height} + height) >= kLeast;
    method_ = bands ? Method::none : Method::histograms;
    until_ = bands ? 0 : INT64_MAX;
}

template <class Histograms>
void ByteWindows<Histograms>::makeRow(uint8_t* medians, Rest* rests) {
    if constexpr (std::is_same_v<Rest, uint16_t>) {
        if (!makeRowByBands(medians, rests)) makeRowByHistograms(medians, rests);
    } else {
        makeRowByHistograms(medians, rests);
    }
    ++y_;
}

template <class Histograms>
void ByteWindows<Histograms>::makeRowByHistograms(uint8_t* medians, Rest* rests) {
    if (y_ == since_)
        histograms_.begin(rows_, y_, columns_, mask_);
    else
        histograms_.advance(rows_.row(ptrdiff_t{y_} + mask_.height - 1), rows_.row(y_ - 1), rows_.apart);
    const auto below = static_cast<int32_t>(int64_t{mask_.width} * mask_.height / 2);
    histograms_.medians(below, medians, rests);
}

// --- few thresholds -------------------------------------------------------------------------------------------------

template <class Histograms>
template <class Bands>
bool ByteWindows<Histograms>::start(Bands& bands, const Thresholds& thresholds, uint8_t* medians, uint16_t* rests) {
    bands.setValues(thresholds);
    bands.build(rows_, y_, columns_, mask_.height);
    return bands.medians(columns_, mask_.width, mask_.width * mask_.height / 2, medians, rests);
}

template <class Histograms>
template <class Bands>
bool ByteWindows<Histograms>::goOn(Bands& bands, uint8_t* medians, uint16_t* rests) {
    bands.advance(rows_.row(ptrdiff_t{y_} + mask_.height - 1), rows_.row(y_ - 1), rows_.apart, columns_);
    return bands.medians(columns_, mask_.width, mask_.width * mask_.height / 2, medians, rests);
}

/// False where the row is one for histograms.
template <class Histograms>
bool ByteWindows<Histograms>::makeRowByBands(uint8_t* medians, uint16_t* rests) {
    if (method_ == Method::histograms && y_ < until_) return false;
    Method least = Method::bands16;
    if (y_ < until_) {
        const bool found = method_ == Method::bands16 ? goOn(bands16_, medians, rests) : goOn(bands32_, medians, rests);
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
    const Method before = std::exchange(method_, std::max(least, methodFor(wanted.count())));
    if (before != Method::histograms || method_ != Method::histograms) since_ = y_;
    until_ = method_ == Method::bands16 ? INT64_MAX : int64_t{y_} + 8 * mask_.height + 64;
    switch (method_) {
        case Method::bands16: (void)start(bands16_, wanted.nearest(16), medians, rests); break;
        case Method::bands32: (void)start(bands32_, wanted.nearest(32), medians, rests); break;
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
        }
    }
    return true;
}

template class ByteWindows<kernels::ColumnParts>;
template class ByteWindows<kernels::ColumnHistograms>;

}  // namespace qori::filter
