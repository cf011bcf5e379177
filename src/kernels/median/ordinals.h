// SPDX-License-Identifier: Apache-2.0
// Elements of any type as bytes, for medians by histograms of bytes: those of a piece of an image are put in order, and
// each is replaced by the number of the bin of equally many that it falls into. What the histograms find is then a bin
// and how many of its elements in the window come before the median; the bin's elements are looked through in order for
// those in the window.
#pragma once
#include <algorithm>
#include <utility>

#include "byte_rows.h"
#include "image/image.h"
#include "order.h"

namespace qori::kernels {
namespace detail {

/// The place of the bit that has n set ones below it; it is there. Halves are skipped without branches: how many of a
/// bin's elements come before a median follows no pattern.
QORI_INLINE int placeOfBit(uint32_t bits, int n) {
    int place = 0;
    for (int half = 16; half > 0; half /= 2) {
        const int below = __builtin_popcount(bits & ((1u << half) - 1));
        const int isAbove = -static_cast<int>(n >= below);
        n -= below & isAbove;
        place += half & isAbove;
        bits >>= half & isAbove;
    }
    return place;
}

}  // namespace detail

/// Coordinate: uint8_t for pieces of up to 256 x 256 elements, uint16_t for larger ones.
template <class T, class Coordinate>
class Ordinals {
    using Word = decltype(rankOf(T{}));
    using Place = std::conditional_t<sizeof(Coordinate) == 1, uint16_t, uint32_t>;
    struct Entry {
        Word rank;
        Place place;  ///< The row above the column, both as coordinates.
    };
    static constexpr int kCoordinateBits = 8 * sizeof(Coordinate), kBins = 256;
    static constexpr int kDigit = sizeof(T) <= 2 ? 8 : 11, kRadix = 1 << kDigit;
    static constexpr int kPasses = (8 * int{sizeof(T)} + kDigit - 1) / kDigit;

public:
    static constexpr int64_t kMostSide = int64_t{1} << kCoordinateBits;

    /// Takes its memory from that of Memory, which hands out or measures: take<Type>(count).
    template <class Memory>
    Ordinals(Memory& memory, int32_t columns, int32_t rows) : stride_(columns) {
        const int64_t most = int64_t{columns} * rows;
        entries_[0] = memory.template take<Entry>(most);
        entries_[1] = memory.template take<Entry>(most);
        counters_ = memory.template take<uint32_t>(kPasses * kRadix);
        bytes_ = memory.template take<uint8_t>(most);
        x_ = memory.template take<Coordinate>(most + kLanes);
        y_ = memory.template take<Coordinate>(most + kLanes);
    }

    /// A piece: src is its first element; columns as given or fewer.
    void read(const T* src, ptrdiff_t step, ptrdiff_t apart, int32_t columns, int32_t rows) {
        const int32_t count = columns * rows;
        __builtin_memset(counters_, 0, sizeof(uint32_t) * kPasses * kRadix);
        Entry* to = entries_[0];
        for (int32_t y = 0; y < rows; ++y) {
            const T* const row = reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(src) + y * step);
            for (int32_t x = 0; x < columns; ++x) {
                const Word rank = rankOf(get(row + x * apart));
                *to++ = {rank,
                         static_cast<Place>(static_cast<uint32_t>(y) << kCoordinateBits | static_cast<uint32_t>(x))};
                for (int pass = 0; pass < kPasses; ++pass) ++counters_[pass * kRadix + digit(rank, pass)];
            }
        }
        int sorted = 0;
        for (int pass = 0; pass < kPasses; ++pass)
            if (distribute(entries_[sorted], entries_[1 - sorted], count, pass)) sorted = 1 - sorted;
        sorted_ = entries_[sorted];
        number(count);
    }

    /// The bin of each element of the piece.
    ByteRows bins() const { return {bytes_, stride_, 1}; }

    /// Of the bin's elements in the window at (x, y), the one that `rest` others come before.
    QORI_INLINE T element(int bin, int32_t rest, int32_t x, int32_t y, QorImageSize window) const {
        const auto corner = [](int32_t v) { return splat(static_cast<Coordinate>(v)); };
        const auto fromX = corner(x), fromY = corner(y), lastX = corner(window.width - 1),
                   lastY = corner(window.height - 1);
        for (int32_t at = bin * perBin_;; at += kLanes) {
            const auto inside = isAtMost(load(x_ + at) - fromX, lastX) & isAtMost(load(y_ + at) - fromY, lastY);
            uint32_t bits = static_cast<uint32_t>(_mm256_movemask_epi8(inside.v));
            if constexpr (sizeof(Coordinate) == 2) bits &= 0x55555555u;
            const int32_t found = __builtin_popcount(bits);
            if (rest < found)
                return elementOf<T>(sorted_[at + detail::placeOfBit(bits, rest) / int{sizeof(Coordinate)}].rank);
            rest -= found;
        }
    }

private:
    static constexpr int kLanes = Vec<Coordinate>::lanes;

    static uint32_t digit(Word rank, int pass) { return static_cast<uint32_t>(rank >> (pass * kDigit)) & (kRadix - 1); }

    /// One pass of a radix sort from the lowest digit; false, and nothing done, where all have the same digit.
    bool distribute(const Entry* from, Entry* to, int32_t count, int pass) {
        uint32_t* const counters = counters_ + pass * kRadix;
        if (counters[digit(from[0].rank, pass)] == static_cast<uint32_t>(count)) return false;
        for (uint32_t i = 0, sum = 0; i < kRadix; ++i) sum += std::exchange(counters[i], sum);
        for (int32_t i = 0; i < count; ++i) to[counters[digit(from[i].rank, pass)]++] = from[i];
        return true;
    }

    /// Bins of whole vectors, as few elements each as 256 bins allow.
    void number(int32_t count) {
        perBin_ = ((count + kBins - 1) / kBins + kLanes - 1) / kLanes * kLanes;
        for (int32_t first = 0, bin = 0; first < count; first += perBin_, ++bin) {
            const int32_t end = std::min(first + perBin_, count);
            for (int32_t i = first; i < end; ++i) {
                const uint32_t place = sorted_[i].place, x = place & ((1u << kCoordinateBits) - 1),
                               y = place >> kCoordinateBits;
                bytes_[static_cast<ptrdiff_t>(y) * stride_ + static_cast<ptrdiff_t>(x)] = static_cast<uint8_t>(bin);
                x_[i] = static_cast<Coordinate>(x);
                y_[i] = static_cast<Coordinate>(y);
            }
        }
        // What is looked at behind the last element lies in no window that lacks its elements before.
        for (int32_t i = count; i < count + kLanes; ++i) x_[i] = y_[i] = 0;
    }

    ptrdiff_t stride_;
    Entry* entries_[2];
    const Entry* sorted_ = nullptr;
    uint32_t* counters_;
    uint8_t* bytes_;
    Coordinate *x_, *y_;
    int32_t perBin_ = 0;
};

}  // namespace qori::kernels
