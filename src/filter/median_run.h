// SPDX-License-Identifier: Apache-2.0
// Medians of rectangles over rows that exist: which way a mask goes, and in which pieces.
#pragma once
#include "kernels/median/histograms.h"
#include "kernels/median/ordinals.h"
#include "kernels/median/search.h"
#include "kernels/median/square5.h"
#include "kernels/median/windows.h"
#include "median_tiles.h"

namespace qori::filter {

/// Masks of 3 x 3, 5 x 5, and of one row or column of up to five, have networks of their own.
inline bool hasNetwork(QorImageSize mask) {
    const auto is = [=](int32_t width, int32_t height) { return mask.width == width && mask.height == height; };
    return is(3, 3) || is(5, 5) || is(3, 1) || is(5, 1) || is(1, 3) || is(1, 5);
}

inline QorResult oddMaskCheck(QorImageSize mask) {
    const bool odd = mask.width % 2 != 0 && mask.height % 2 != 0;
    return mask.width < 1 || mask.height < 1 || !odd ? QOR_ERR_MASK_SIZE : QOR_OK;
}

constexpr int kMostNetworkRows = 32;

/// Rows that the network of a mask makes at a time, at most. 5 x 5 puts four rows in order before the first.
inline int32_t networkRows(QorImageSize mask, int32_t mostOf5x5 = kMostNetworkRows) {
    return mask.width == 1 || mask.height == 1 ? 1 : mask.width == 3 ? 4 : mostOf5x5;
}

/// `rows` destination rows by the network of a mask. source(k): the first element of row k of the first window;
/// neighbours are `apart` elements away. Sources may not be destinations.
template <bool keepAlpha, class T, class Source>
void medianByNetwork(QorImageSize mask, Source source, T* const* dst, int32_t rows, ptrdiff_t elements,
                     ptrdiff_t apart) {
    const T* src[kMostNetworkRows + 4];
    if (mask.width == 1 || mask.height == 1) {
        const int n = mask.width * mask.height;
        for (int k = 0; k < n; ++k) src[k] = mask.width == 1 ? source(k) : source(0) + k * apart;
        const auto medianOfRows =
            n == 3 ? kernels::medianOfRows<3, keepAlpha, T> : kernels::medianOfRows<5, keepAlpha, T>;
        return medianOfRows(src, dst[0], elements);
    }
    for (int32_t k = 0; k < rows + mask.height - 1; ++k) src[k] = source(k);
    if (mask.width == 5) return kernels::medianSquare5<keepAlpha>(src, dst, rows, elements, apart);
    if (rows == 4) return kernels::medianSquare3<4, keepAlpha>(src, dst, elements, apart);
    for (int32_t k = 0; k < rows; ++k) kernels::medianSquare3<1, keepAlpha>(src + k, dst + k, elements, apart);
}

/// Bytes by histograms, in strips of columns from top to bottom.
template <class Bins>
class ByteMedians {
    using Histograms = kernels::ColumnHistograms<Bins>;

public:
    /// Columns whose counts stay in the first-level cache, unless the mask alone takes more.
    static int32_t columnsOf(QorImageSize size, QorImageSize mask) {
        const int64_t most = std::max(2 * int64_t{mask.width}, int64_t{kCache / Histograms::kColumnBytes});
        return static_cast<int32_t>(std::min({int64_t{size.width} + mask.width - 1, most, int64_t{INT32_MAX}}));
    }
    template <class T>
    ByteMedians(WorkBuffer& memory, const MedianJob<T>& job)
        : columns_(columnsOf(job.size, job.mask)),
          histograms_(memory.take<uint8_t>(int64_t{columns_} * Histograms::kColumnBytes)) {}

    void run(const MedianJob<uint8_t>& job) const {
        for (int c = 0; c < job.channels; ++c)
            for (int64_t x = 0; x < job.size.width; x += columns_ - job.mask.width + 1)
                strip(job, static_cast<ptrdiff_t>(x * job.apart + c), static_cast<int32_t>(job.size.width - x));
    }

private:
    static constexpr int kCache = 44 << 10;

    void strip(const MedianJob<uint8_t>& job, ptrdiff_t at, int32_t width) const {
        const auto columns = static_cast<int32_t>(std::min(int64_t{columns_}, int64_t{width} + job.mask.width - 1));
        Histograms histograms(histograms_, columns, job.mask.width);
        for (int32_t y = 0; y < job.mask.height; ++y) histograms.enter(job.windows.row(y) + at, job.apart);
        for (int32_t y = 0; y < job.size.height; ++y) {
            if (y > 0)
                histograms.advance(job.windows.row(y + job.mask.height - 1) + at, job.windows.row(y - 1) + at,
                                   job.apart);
            uint8_t* const to = job.dst.row(y) + at;
            histograms.medians(
                job.below(), [ =, apart = job.apart ](int32_t x, int byte, int32_t) __attribute__((always_inline)) {
                    to[ptrdiff_t{x} * apart] = static_cast<uint8_t>(byte);
                });
        }
    }

    int32_t columns_;
    uint8_t* histograms_;
};

/// Other elements by their ordinals, in tiles.
template <class T, class Bins, class Coordinate>
class OrdinalMedians {
    using Histograms = kernels::ColumnHistograms<Bins>;
    using Ordinals = kernels::Ordinals<T, Coordinate>;

public:
    /// Sides of the pieces of which tiles are made, surroundings included.
    static int32_t sideOf(int32_t size, int32_t mask) {
        const int64_t wanted = (sizeof(Coordinate) == 1 ? 3 : 2) * int64_t{mask};
        const int64_t most = std::min(std::max(int64_t{kSide}, wanted), Ordinals::kMostSide);
        return static_cast<int32_t>(std::min(int64_t{size} + mask - 1, std::max(most, int64_t{mask})));
    }
    OrdinalMedians(WorkBuffer& memory, const MedianJob<T>& job)
        : columns_(sideOf(job.size.width, job.mask.width)),
          rows_(sideOf(job.size.height, job.mask.height)),
          histograms_(memory.take<uint8_t>(int64_t{columns_} * Histograms::kColumnBytes)),
          rests_(memory.take<Rest>(columns_)),
          bytes_(memory.take<uint8_t>(columns_)),
          ordinals_(memory, columns_, rows_) {}

    void run(const MedianJob<T>& job) {
        const int32_t width = columns_ - job.mask.width + 1, height = rows_ - job.mask.height + 1;
        for (int c = 0; c < job.channels; ++c)
            for (int64_t y = 0; y < job.size.height; y += height)
                for (int64_t x = 0; x < job.size.width; x += width)
                    tile(job, static_cast<ptrdiff_t>(x * job.apart + c), static_cast<int32_t>(y),
                         {static_cast<int32_t>(std::min(int64_t{width}, job.size.width - x)),
                          static_cast<int32_t>(std::min(int64_t{height}, job.size.height - y))});
    }

private:
    using Rest = typename Bins::Rest;
    static constexpr int kSide = 90;  // bins of 32 elements, which one comparison of vectors looks through

    void tile(const MedianJob<T>& job, ptrdiff_t at, int32_t y0, QorImageSize size) {
        const int32_t columns = size.width + job.mask.width - 1, rows = size.height + job.mask.height - 1;
        ordinals_.read(job.windows.row(y0) + at, job.windows.step, job.apart, columns, rows);
        Histograms histograms(histograms_, columns, job.mask.width);
        for (int32_t y = 0; y < job.mask.height; ++y) histograms.enter(ordinals_.row(y), 1);
        for (int32_t y = 0; y < size.height; ++y) {
            if (y > 0) histograms.advance(ordinals_.row(y + job.mask.height - 1), ordinals_.row(y - 1), 1);
            histograms.medians(
                job.below(),
                [ bins = bytes_, rests = rests_ ](int32_t x, int bin, int32_t rest) __attribute__((always_inline)) {
                    bins[x] = static_cast<uint8_t>(bin);
                    rests[x] = static_cast<Rest>(rest);
                });
            T* const to = job.dst.row(y0 + y) + at;
            for (int32_t x = 0; x < size.width; ++x)
                kernels::put(to + ptrdiff_t{x} * job.apart,
                             ordinals_.element(bytes_[x], static_cast<int32_t>(rests_[x]), x, y, job.mask));
        }
    }

    int32_t columns_, rows_;
    uint8_t* histograms_;
    Rest* rests_;
    uint8_t* bytes_;
    Ordinals ordinals_;
};

/// Any mask, with work memory from the allocator: QOR_ERR_NO_MEMORY and nothing done where there is none.
template <class Method, class T>
QorResult runMethod(const MedianJob<T>& job) {
    WorkBuffer measured(nullptr);
    (void)Method(measured, job);
    const WorkMemory memory(measured.bytes());
    if (QorResult r = memory.check()) return r;
    WorkBuffer work(memory.begin<uint8_t>(1));
    Method(work, job).run(job);
    return QOR_OK;
}

template <class T>
QorResult medianOfAny(const MedianJob<T>& job) {
    using kernels::LargeBins;
    using kernels::SmallBins;
    if constexpr (sizeof(T) < 8)
        if (tilesPay<T>(job.size, job.mask)) return runMethod<TileMedians<T>>(job);
    const bool small = SmallBins::suffice(job.mask.width, job.mask.height);
    if constexpr (sizeof(T) == 1) {
        return small ? runMethod<ByteMedians<SmallBins>>(job) : runMethod<ByteMedians<LargeBins>>(job);
    } else {
        constexpr int32_t kMostForBytes = 128;
        if (small && std::max(job.mask.width, job.mask.height) <= kMostForBytes)
            return runMethod<OrdinalMedians<T, SmallBins, uint8_t>>(job);
        constexpr int32_t kMostForWords = 1 << 15;
        if (std::max(job.mask.width, job.mask.height) > kMostForWords) return QOR_ERR_NO_MEMORY;
        return runMethod<OrdinalMedians<T, LargeBins, uint16_t>>(job);
    }
}

}  // namespace qori::filter
