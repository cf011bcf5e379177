// SPDX-License-Identifier: Apache-2.0
// Medians of any rectangle over rows that exist: which way a mask goes, and in which pieces.
#include "kernels/median/ordinals.h"
#include "median_bytes.h"
#include "median_run.h"
#include "median_tiles.h"

namespace qori::filter {

// Not in an unnamed namespace: what is called once would be inlined there, and be 3 % slower.

/// Bytes, in strips of columns from top to bottom.
template <class Histograms>
class ByteMedians {
    using Windows = ByteWindows<Histograms>;

public:
    template <class T>
    ByteMedians(WorkBuffer& memory, const MedianJob<T>& job)
        : columns_(Windows::columnsOf(job.size, job.mask)),
          windows_(memory, columns_, job.mask),
          row_(memory.take<uint8_t>(columns_)) {}

    void run(const MedianJob<uint8_t>& job) {
        const int32_t width = columns_ - job.mask.width + 1;
        for (int c = 0; c < job.channels; ++c)
            for (int64_t x = 0; x < job.size.width; x += width)
                strip(job, static_cast<ptrdiff_t>(x * job.apart + c),
                      static_cast<int32_t>(std::min(int64_t{width}, job.size.width - x)));
    }

private:
    void strip(const MedianJob<uint8_t>& job, ptrdiff_t at, int32_t width) {
        windows_.begin({job.windows.data + at, job.windows.step, job.apart}, width + job.mask.width - 1);
        for (int32_t y = 0; y < job.size.height; ++y) {
            uint8_t* const to = job.dst.row(y) + at;
            if (job.apart == 1) {
                windows_.makeRow(to, nullptr);
            } else {
                windows_.makeRow(row_, nullptr);
                for (int32_t x = 0; x < width; ++x) to[ptrdiff_t{x} * job.apart] = row_[x];
            }
        }
    }

    int32_t columns_;
    Windows windows_;
    uint8_t* row_;
};

/// Other elements by their ordinals, in tiles.
template <class T, class Histograms, class Coordinate>
class OrdinalMedians {
    using Ordinals = kernels::Ordinals<T, Coordinate>;

public:
    /// Sides of the pieces of which tiles are made, surroundings included.
    static int32_t sideOf(int32_t size, int32_t mask) {
        constexpr int64_t kFull[] = {90, 128, 156, 181, 202, 221, 239, 256};  // 256 bins of n vectors of elements
        int64_t wanted = (sizeof(Coordinate) == 1 ? 3 : 2) * int64_t{mask};
        if constexpr (sizeof(Coordinate) == 1) {
            constexpr int kMargin = 4;
            const int64_t* full = kFull;
            while (*full + kMargin < wanted && full != std::end(kFull) - 1) ++full;
            wanted = *full;
        }
        const int64_t most = std::min(std::max(int64_t{kFull[0]}, wanted), Ordinals::kMostSide);
        return static_cast<int32_t>(std::min(int64_t{size} + mask - 1, std::max(most, int64_t{mask})));
    }
    OrdinalMedians(WorkBuffer& memory, const MedianJob<T>& job)
        : columns_(sideOf(job.size.width, job.mask.width)),
          rows_(sideOf(job.size.height, job.mask.height)),
          windows_(memory, columns_, job.mask),
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
    using Rest = typename Histograms::Rest;

    void tile(const MedianJob<T>& job, ptrdiff_t at, int32_t y0, QorImageSize size) {
        const int32_t columns = size.width + job.mask.width - 1, rows = size.height + job.mask.height - 1;
        ordinals_.read(job.windows.row(y0) + at, job.windows.step, job.apart, columns, rows);
        windows_.begin(ordinals_.bins(), columns);
        for (int32_t y = 0; y < size.height; ++y) {
            windows_.makeRow(bytes_, rests_);
            T* const to = job.dst.row(y0 + y) + at;
            for (int32_t x = 0; x < size.width; ++x)
                kernels::put(to + ptrdiff_t{x} * job.apart,
                             ordinals_.element(bytes_[x], static_cast<int32_t>(rests_[x]), x, y, job.mask));
        }
    }

    int32_t columns_, rows_;
    ByteWindows<Histograms> windows_;
    Rest* rests_;
    uint8_t* bytes_;
    Ordinals ordinals_;
};

/// With work memory from the allocator.
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
    using kernels::ColumnHistograms;
    using kernels::ColumnParts;
    if constexpr (sizeof(T) < 8)
        if (tilesPay<T>(job.size, job.mask)) return runMethod<TileMedians<T>>(job);
    const bool small = ColumnParts::suffice(job.mask.width, job.mask.height);
    if constexpr (sizeof(T) == 1) {
        return small ? runMethod<ByteMedians<ColumnParts>>(job) : runMethod<ByteMedians<ColumnHistograms>>(job);
    } else {
        constexpr int32_t kMostForBytes = 128;
        if (small && std::max(job.mask.width, job.mask.height) <= kMostForBytes)
            return runMethod<OrdinalMedians<T, ColumnParts, uint8_t>>(job);
        constexpr int32_t kMostForWords = 1 << 15;
        if (std::max(job.mask.width, job.mask.height) > kMostForWords) return QOR_ERR_NO_MEMORY;
        return runMethod<OrdinalMedians<T, ColumnHistograms, uint16_t>>(job);
    }
}

template QorResult medianOfAny(const MedianJob<uint8_t>&);
template QorResult medianOfAny(const MedianJob<uint16_t>&);
template QorResult medianOfAny(const MedianJob<int16_t>&);
template QorResult medianOfAny(const MedianJob<float>&);
template QorResult medianOfAny(const MedianJob<double>&);

}  // namespace qori::filter
