// SPDX-License-Identifier: Apache-2.0
// Medians of bytes by histograms of columns, at a cost that does not grow with the window (Perreault and Hebert: Median
// filtering in constant time, 2007). Every column keeps counts of the part of it that the windows of a row see: 16
// coarse ones by the upper four bits, 16 times 16 fine ones by the lower four. All counts are of elements up to a bin,
// not in it, so that a comparison with the rank finds the bin. The window's coarse counts follow it from pixel to
// pixel; its fine ones are brought up to date for the bin in question alone.
#pragma once
#include "byte_rows.h"
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels {

/// Windows of up to 32767 elements and 255 rows.
struct SmallBins {
    using Column = uint8_t;
    using Rest = uint16_t;
    __m256i v;

    static bool suffice(int64_t width, int64_t height) { return height <= 255 && width * height <= 32767; }
    QORI_INLINE static SmallBins none() { return {_mm256_setzero_si256()}; }
    QORI_INLINE static __m256i columnAt(const uint8_t* p) {
        return _mm256_cvtepu8_epi16(_mm_load_si128(reinterpret_cast<const __m128i*>(p)));
    }
    QORI_INLINE void add(const uint8_t* p) { v = _mm256_add_epi16(v, columnAt(p)); }
    QORI_INLINE void subtract(const uint8_t* p) { v = _mm256_sub_epi16(v, columnAt(p)); }
    /// The first bin up to which there are more than `below` elements, of which there is one, and how many there are
    /// up to the bin before.
    QORI_INLINE int find(int32_t below, int32_t* before) const {
        const __m256i more = _mm256_cmpgt_epi16(v, _mm256_set1_epi16(static_cast<int16_t>(below)));
        alignas(kVectorBytes) uint16_t counts[32];
        _mm256_store_si256(reinterpret_cast<__m256i*>(counts), _mm256_setzero_si256());
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(counts + 1), v);
        const int bin = __builtin_ctz(static_cast<unsigned>(_mm256_movemask_epi8(more))) / 2;
        *before = counts[bin];
        return bin;
    }
    QORI_INLINE static void count(uint8_t* p, const uint8_t* step, bool enters) {
        auto* const at = reinterpret_cast<__m128i*>(p);
        const __m128i steps = _mm_load_si128(reinterpret_cast<const __m128i*>(step));
        const __m128i old = _mm_load_si128(at);
        _mm_store_si128(at, enters ? _mm_sub_epi8(old, steps) : _mm_add_epi8(old, steps));
    }
};

/// Windows of any size that fits memory.
struct LargeBins {
    using Column = uint32_t;
    using Rest = uint32_t;
    uint32_t v[16];

    static LargeBins none() { return {}; }
    void add(const uint32_t* p) {
        for (int i = 0; i < 16; ++i) v[i] += p[i];
    }
    void subtract(const uint32_t* p) {
        for (int i = 0; i < 16; ++i) v[i] -= p[i];
    }
    int find(uint32_t below, int32_t* before) const {
        int bin = 0;
        while (v[bin] <= below) ++bin;
        *before = bin == 0 ? 0 : static_cast<int32_t>(v[bin - 1]);
        return bin;
    }
    static void count(uint32_t* p, const uint8_t* step, bool enters) {
        for (int i = 0; i < 16; ++i) p[i] += static_cast<uint32_t>(static_cast<int8_t>(enters ? -step[i] : step[i]));
    }
};

namespace detail {

struct Steps {
    alignas(16) uint8_t from[16][16];  ///< from[k]: -1 (as a byte) in bins k and beyond, 0 before.
};
constexpr Steps stepsTable() {
    Steps steps{};
    for (int k = 0; k < 16; ++k)
        for (int i = k; i < 16; ++i) steps.from[k][i] = 255;
    return steps;
}
alignas(64) inline constexpr Steps kSteps = stepsTable();

}  // namespace detail

template <class Bins>
class ColumnHistograms {
public:
    using Column = typename Bins::Column;
    static constexpr int kBins = 16, kColumnBytes = (kBins + kBins * kBins) * int{sizeof(Column)};

    /// Memory of kColumnBytes for each column, on a 32-byte boundary.
    explicit ColumnHistograms(uint8_t* memory) : memory_(memory) {}

    /// The windows of row y of so many columns come into sight.
    void begin(const ByteRows& rows, int32_t y, int32_t columns, QorImageSize window) {
        coarse_ = reinterpret_cast<Column*>(memory_);
        fine_ = coarse_ + ptrdiff_t{columns} * kBins;
        columns_ = columns;
        width_ = window.width;
        __builtin_memset(memory_, 0, static_cast<size_t>(columns) * kColumnBytes);
        for (int32_t k = 0; k < window.height; ++k) enter(rows.row(ptrdiff_t{y} + k), rows.apart);
    }
    /// The lowest row, and the one that went out of sight.
    void advance(const uint8_t* entering, const uint8_t* leaving, ptrdiff_t apart) {
        for (int32_t x = 0; x < columns_; ++x) {
            const int in = entering[x * apart], out = leaving[x * apart];
            Column* const coarse = coarse_ + ptrdiff_t{x} * kBins;
            Bins::count(coarse, detail::kSteps.from[in >> 4], true);
            Bins::count(coarse, detail::kSteps.from[out >> 4], false);
            Bins::count(fineAt(x, in >> 4), detail::kSteps.from[in & 15], true);
            Bins::count(fineAt(x, out >> 4), detail::kSteps.from[out & 15], false);
        }
    }
    /// Medians of the row's windows: bytes with at most `below` elements before them, and how many of the elements
    /// equal to it come before the median. emit(x, byte, rest).
    template <class Emit>
    QORI_INLINE void medians(int32_t below, Emit emit) const {
        Bins coarse = Bins::none(), fine[kBins], current = Bins::none();
        int32_t seen[kBins];  // the window for which fine counts were last right
        for (int32_t& x : seen) x = -width_;
        for (int32_t x = 0; x < width_; ++x) coarse.add(coarse_ + ptrdiff_t{x} * kBins);
        for (int32_t x = 0, last = -1;; ++x) {
            int32_t before, rest;
            const int high = coarse.find(below, &before);
            if (high == last) {
                current.add(fineAt(x + width_ - 1, high));
                current.subtract(fineAt(x - 1, high));
            } else {
                if (last >= 0) fine[last] = current, seen[last] = x - 1;
                current = broughtTo(x, fine[high], high, seen[high]);
                last = high;
            }
            const int low = current.find(below - before, &rest);
            emit(x, 16 * high + low, below - before - rest);
            if (x + width_ >= columns_) return;
            coarse.add(coarse_ + ptrdiff_t{x + width_} * kBins);
            coarse.subtract(coarse_ + ptrdiff_t{x} * kBins);
        }
    }

private:
    void enter(const uint8_t* row, ptrdiff_t apart) {
        for (int32_t x = 0; x < columns_; ++x) countAt(x, row[x * apart], true);
    }
    Column* fineAt(int32_t x, int high) const { return fine_ + (ptrdiff_t{x} * kBins + high) * kBins; }
    void countAt(int32_t x, int value, bool enters) {
        Bins::count(coarse_ + ptrdiff_t{x} * kBins, detail::kSteps.from[value >> 4], enters);
        Bins::count(fineAt(x, value >> 4), detail::kSteps.from[value & 15], enters);
    }
    /// Fine counts of the window at `from` brought to that at `to`, or made anew where that is less work.
    QORI_INLINE Bins broughtTo(int32_t to, const Bins& fine, int high, int32_t from) const {
        Bins now;
        if (2 * (to - from) > width_) {
            now = Bins::none();
            for (int32_t x = to; x < to + width_; ++x) now.add(fineAt(x, high));
        } else {
            now = fine;
            for (int32_t x = from; x < to; ++x) {
                now.add(fineAt(x + width_, high));
                now.subtract(fineAt(x, high));
            }
        }
        return now;
    }

    uint8_t* memory_;
    Column *coarse_ = nullptr, *fine_ = nullptr;
    int32_t columns_ = 0, width_ = 0;
};

}  // namespace qori::kernels
