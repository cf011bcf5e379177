// SPDX-License-Identifier: Apache-2.0
// Medians by tiles: the image's rows as planes, so that a vector has the same pixel of as many tiles side by side.
#pragma once
#include "kernels/median/planes.h"
#include "kernels/median/tiles.h"
#include "median_job.h"

namespace qori::filter {

/// How many times as long as tiles histograms take for as many pixels, measured at 16 x 16 to 64 x 64: for squares with
/// code of their own and for other masks, by their area.
template <class T>
constexpr double histogramsTake(bool hasCode, int32_t area) {
    const bool isSmall = area <= 9 * 9, isLarge = area > 15 * 15;
    if (!hasCode) return isSmall ? 4 : 2;
    if (isLarge) return sizeof(T) == 2 ? 1.5 : 1.25;
    return isSmall ? 6 : sizeof(T) == 2 ? 3 : 2;
}

/// Whether tiles beat histograms. They cost what whole vectors of tiles cost, and at first as much as some 2,000 pixels
/// for the lists of comparators, 500 where there is code instead. Larger masks and 64-bit elements gain nothing.
template <class T>
bool tilesPay(QorImageSize size, QorImageSize mask) {
    if constexpr (sizeof(T) == 8) return false;
    namespace tiles = kernels::tiles;
    if (std::max(mask.width, mask.height) > tiles::kMostMask) return false;
    const int32_t area = mask.width * mask.height;
    const bool hasCode =
        mask.width == mask.height && mask.width >= tiles::kLeastFixed && mask.width <= tiles::mostFixed(Vec<T>::lanes);
    if (!hasCode && area > (sizeof(T) == 2 ? 15 * 15 : 11 * 11)) return false;
    const int64_t width = int64_t{tiles::sideOf(mask.width)} * Vec<T>::lanes, height = tiles::sideOf(mask.height);
    const int64_t made = roundUp(size.width, width) * roundUp(size.height, height);
    const double others = static_cast<double>(int64_t{size.width} * size.height) * histogramsTake<T>(hasCode, area);
    return others >= static_cast<double>(made + (hasCode ? 500 : 2000));
}

template <class T>
class TileMedians {
    using K = kernels::tiles::TileKey<T>;
    using V = Vec<K>;
    static constexpr int kLanes = V::lanes;

public:
    TileMedians(WorkBuffer& memory, const MedianJob<T>& job)
        : tiles_(memory, job.mask), tile_(tiles_.tile()), seen_(tiles_.footprint()) {
        const int32_t groups = (job.size.width + groupWidth() - 1) / groupWidth();
        const int64_t fit = kCache / (int64_t{seen_.height} * groupWidth() * int64_t{sizeof(T)});
        groups_ = static_cast<int32_t>(std::clamp(fit, int64_t{1}, int64_t{groups}));
        const int32_t beyond = (seen_.width - 1) / tile_.width;
        planeLanes_ = groups_ * kLanes + (beyond + kLanes - 1) / kLanes * kLanes;
        planes_ = memory.take<K>(int64_t{planeLanes_} * tile_.width * seen_.height);
        medians_ = memory.take<V>(tile_.width * tile_.height);
    }

    void run(const MedianJob<T>& job) {
        ptrdiff_t columns[kernels::tiles::kMostFootprint];
        for (int32_t x = 0; x < seen_.width; ++x)
            columns[x] = ptrdiff_t{x % tile_.width} * planeLanes_ + x / tile_.width;
        const int32_t width = groups_ * groupWidth();
        for (int c = 0; c < job.channels; ++c)
            for (int64_t x = 0; x < job.size.width; x += width)
                strip(job, columns, c, static_cast<int32_t>(x),
                      static_cast<int32_t>(std::min(int64_t{width}, job.size.width - x)));
    }

private:
    static constexpr int kCache = 256 << 10;

    /// Pixels of a row of tiles that one vector has.
    int32_t groupWidth() const { return tile_.width * kLanes; }
    K* planesOf(int32_t y) const { return planes_ + ptrdiff_t{y % seen_.height} * tile_.width * planeLanes_; }

    /// Rows are kept as planes for as long as windows see them.
    void strip(const MedianJob<T>& job, const ptrdiff_t* columns, int channel, int32_t x0, int32_t width) {
        const int64_t lastRow = int64_t{job.size.height} + job.mask.height - 2;
        const K* rows[kernels::tiles::kMostFootprint];
        int64_t read = 0;
        for (int64_t y = 0; y < job.size.height; y += tile_.height) {
            // Rows behind the last one belong to windows of pixels that are not there: any elements will do.
            for (const int64_t end = std::min(y + seen_.height, lastRow + 1); read < end; ++read)
                readRow(job, channel, x0, width + job.mask.width - 1, static_cast<int32_t>(read));
            const auto height = static_cast<int32_t>(std::min(int64_t{tile_.height}, job.size.height - y));
            for (int32_t x = 0; x < width; x += groupWidth()) {
                for (int32_t k = 0; k < seen_.height; ++k)
                    rows[k] = planesOf(static_cast<int32_t>(std::min(y + k, lastRow))) + x / tile_.width;
                tiles_.run(rows, columns, medians_);
                for (int32_t k = 0; k < height; ++k)
                    writeRow(job, medians_ + k * tile_.width,
                             job.dst.row(static_cast<int32_t>(y) + k) + ptrdiff_t{x0 + x} * job.apart + channel,
                             std::min(width - x, groupWidth()));
            }
        }
    }

    void readRow(const MedianJob<T>& job, int channel, int32_t x0, int32_t elements, int32_t y) const {
        const T* from = job.windows.row(y) + ptrdiff_t{x0} * job.apart + channel;
        K* to = planesOf(y);
        for (; elements > 0; elements -= groupWidth(), from += ptrdiff_t{groupWidth()} * job.apart, to += kLanes) {
            V v[kernels::planes::kMost];
            if (job.apart == 1 && elements >= groupWidth()) {
                for (int i = 0; i < tile_.width; ++i) v[i] = kernels::tiles::tileKeysOf(load(from + i * kLanes));
            } else {
                alignas(kVectorBytes) T some[kernels::planes::kMost * kLanes] = {};
                const int32_t n = std::min(elements, groupWidth());
                for (int32_t i = 0; i < n; ++i) some[i] = kernels::get(from + ptrdiff_t{i} * job.apart);
                for (int i = 0; i < tile_.width; ++i) v[i] = kernels::tiles::tileKeysOf(load(some + i * kLanes));
            }
            kernels::planes::fromRow(v, tile_.width);
            for (int i = 0; i < tile_.width; ++i) store(to + ptrdiff_t{i} * planeLanes_, v[i]);
        }
    }

    void writeRow(const MedianJob<T>& job, V* v, T* to, int32_t elements) const {
        kernels::planes::toRow(v, tile_.width);
        if (job.apart == 1 && elements == groupWidth()) {
            for (int i = 0; i < tile_.width; ++i) store(to + i * kLanes, kernels::tiles::elementsOfTile<T>(v[i]));
        } else {
            alignas(kVectorBytes) T some[kernels::planes::kMost * kLanes];
            for (int i = 0; i < tile_.width; ++i) store(some + i * kLanes, kernels::tiles::elementsOfTile<T>(v[i]));
            for (int32_t i = 0; i < elements; ++i) kernels::put(to + ptrdiff_t{i} * job.apart, some[i]);
        }
    }

    kernels::MedianTiles<K> tiles_;
    QorImageSize tile_, seen_;
    int32_t groups_ = 0, planeLanes_ = 0;
    K* planes_ = nullptr;
    V* medians_ = nullptr;
};

}  // namespace qori::filter
