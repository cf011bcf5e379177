// SPDX-License-Identifier: Apache-2.0
// Medians of bytes of windows of any size that fits memory, by histograms of columns (Perreault and Hebert: Median
// filtering in constant time, 2007). Every column keeps counts of the part of it that the windows of a row see: 16
// coarse ones by the upper four bits, 16 times 16 fine ones by the lower four. All counts are of elements up to a bin,
// not in it, so that a comparison with the rank finds the bin. The window's coarse counts follow it from pixel to
// pixel; its fine ones are brought up to date for the bin in question alone.
#pragma once
#include "byte_rows.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels {

namespace detail {

struct Steps {
    int8_t from[16][16];  ///< from[k]: 1 in bins k and beyond, 0 before.
};
constexpr Steps stepsTable() {
    Steps steps{};
    for (int k = 0; k < 16; ++k)
        for (int i = k; i < 16; ++i) steps.from[k][i] = 1;
    return steps;
}
alignas(64) inline constexpr Steps kSteps = stepsTable();

}  // namespace detail

class ColumnHistograms {
public:
    using Rest = uint32_t;

    static int64_t bytes(int32_t columns) { return int64_t{columns} * kColumnBytes; }
    static constexpr int kBins = 16, kColumnBytes = (kBins + kBins * kBins) * int{sizeof(uint32_t)};

    /// Memory of kColumnBytes for each column, on a 32-byte boundary.
    explicit ColumnHistograms(uint8_t* memory) : memory_(memory) {}

    /// Of so many columns, none of them counted yet.
    void begin(const ByteRows& rows, int32_t columns, QorImageSize window) {
        coarse_ = reinterpret_cast<uint32_t*>(memory_);
        fine_ = coarse_ + ptrdiff_t{columns} * kBins;
        rows_ = rows;
        window_ = window;
    }
    /// Counts what the windows of row y see of the columns.
    void build(int32_t y, int32_t from, int32_t to) {
        const auto clear = [=](uint32_t* counts, int bins) {
            __builtin_memset(counts + ptrdiff_t{from} * bins, 0,
                             sizeof(uint32_t) * static_cast<size_t>((to - from) * ptrdiff_t{bins}));
        };
        clear(coarse_, kBins);
        clear(fine_, kBins * kBins);
        for (int32_t k = 0; k < window_.height; ++k) {
            const uint8_t* const row = rows_.row(ptrdiff_t{y} + k);
            for (int32_t x = from; x < to; ++x) countAt(x, row[x * rows_.apart], true);
        }
    }
    /// The windows of row y come into sight, those of the row above go, of columns that are counted.
    void advance(int32_t y, int32_t from, int32_t to) {
        const uint8_t *const entering = rows_.row(ptrdiff_t{y} + window_.height - 1), *const leaving = rows_.row(y - 1);
        for (int32_t x = from; x < to; ++x) {
            countAt(x, entering[x * rows_.apart], true);
            countAt(x, leaving[x * rows_.apart], false);
        }
    }
    /// Medians of the row's windows first to end - 1: bytes with at most `below` elements before them, and, unless
    /// rests is null, how many of the elements equal to it come before the median.
    void medians(int32_t first, int32_t end, int32_t below, uint8_t* to, uint32_t* rests) const {
        const int32_t width = window_.width;
        const auto rank = static_cast<uint32_t>(below);
        Bins coarse{}, fine[kBins], current{};
        int32_t seen[kBins];  // the window for which fine counts were last right
        for (int32_t& x : seen) x = first - width;
        for (int32_t x = first; x < first + width; ++x) coarse.add(coarse_ + ptrdiff_t{x} * kBins);
        for (int32_t x = first, last = -1;; ++x) {
            uint32_t before, rest;
            const int high = coarse.find(rank, &before);
            if (high == last) {
                current.add(fineAt(x + width - 1, high));
                current.subtract(fineAt(x - 1, high));
            } else {
                if (last >= 0) fine[last] = current, seen[last] = x - 1;
                current = broughtTo(x, fine[high], high, seen[high]);
                last = high;
            }
            const int low = current.find(rank - before, &rest);
            to[x] = static_cast<uint8_t>(kBins * high + low);
            if (rests != nullptr) rests[x] = rank - before - rest;
            if (x + 1 == end) return;
            coarse.add(coarse_ + ptrdiff_t{x + width} * kBins);
            coarse.subtract(coarse_ + ptrdiff_t{x} * kBins);
        }
    }

private:
    struct Bins {
        uint32_t v[kBins];

        void add(const uint32_t* p) {
            for (int i = 0; i < kBins; ++i) v[i] += p[i];
        }
        void subtract(const uint32_t* p) {
            for (int i = 0; i < kBins; ++i) v[i] -= p[i];
        }
        /// The first bin up to which there are more than `below` elements, of which there is one, and how many there
        /// are up to the bin before.
        int find(uint32_t below, uint32_t* before) const {
            int bin = 0;
            while (v[bin] <= below) ++bin;
            *before = bin == 0 ? 0 : v[bin - 1];
            return bin;
        }
    };

    uint32_t* fineAt(int32_t x, int high) const { return fine_ + (ptrdiff_t{x} * kBins + high) * kBins; }
    static void count(uint32_t* p, const int8_t* steps, bool enters) {
        for (int i = 0; i < kBins; ++i) p[i] += static_cast<uint32_t>(enters ? steps[i] : -steps[i]);
    }
    void countAt(int32_t x, int value, bool enters) {
        count(coarse_ + ptrdiff_t{x} * kBins, detail::kSteps.from[value >> 4], enters);
        count(fineAt(x, value >> 4), detail::kSteps.from[value & 15], enters);
    }
    /// Fine counts of the window at `from` brought to that at `to`, or made anew where that is less work.
    QORI_INLINE Bins broughtTo(int32_t to, const Bins& fine, int high, int32_t from) const {
        Bins now;
        if (2 * (to - from) > window_.width) {
            now = {};
            for (int32_t x = to; x < to + window_.width; ++x) now.add(fineAt(x, high));
        } else {
            now = fine;
            for (int32_t x = from; x < to; ++x) {
                now.add(fineAt(x + window_.width, high));
                now.subtract(fineAt(x, high));
            }
        }
        return now;
    }

    uint8_t* memory_;
    uint32_t *coarse_ = nullptr, *fine_ = nullptr;
    ByteRows rows_{};
    QorImageSize window_{};
};

}  // namespace qori::kernels
