// SPDX-License-Identifier: Apache-2.0
// Complex columns of several channels as lanes: eight of them between rows of an image and lines.
#pragma once
#include <utility>

#include "move_lines.h"

namespace qori::kernels::line {

/// Where the parts of eight columns are, the first one being of channel `first`: real ones among 17 elements, imaginary
/// ones as many behind them as there are channels.
template <int channels, int first>
struct ChannelPlaces {
    static constexpr int at(int lane) {
        const int column = first + lane, channel = column % channels;
        return 2 * (column - channel) + channel - first;
    }
    /// Real parts are read from two vectors, elements 0 to 7 and those from this one on.
    static constexpr int second() {
        int lane = 0;
        while (at(lane) < kLineColumns) ++lane;
        return at(lane);
    }
    static constexpr int readFrom(int lane) {
        return at(lane) < kLineColumns ? at(lane) : at(lane) - second() + kLineColumns;
    }
    /// Three vectors are written; element e is the real part of this lane or the imaginary one of this - 8, or -1.
    static constexpr int writtenFrom(int e) {
        for (int lane = 0; lane < kLineColumns; ++lane) {
            if (at(lane) == e) return lane;
            if (at(lane) + channels == e) return lane + kLineColumns;
        }
        return -1;
    }
    static constexpr int kWritten = at(kLineColumns - 1) + channels + 1;
};

template <int channels, int first>
class ChannelLanes {
    using Places = ChannelPlaces<channels, first>;
    using InLanes = std::make_integer_sequence<int, kLineColumns>;

public:
    explicit ChannelLanes(const LineColumns& columns) {
        alignas(kVectorBytes) int32_t reads[2][kLineColumns] = {}, writes[kVectors][kLineColumns] = {};
        for (int lane = columns.begin; lane < columns.end; ++lane) {
            if ((first + lane) % channels >= columns.rows.processed) continue;
            const int from = Places::readFrom(lane), re = Places::at(lane), im = re + channels;
            reads[from / kLineColumns][from % kLineColumns] = -1;
            writes[re / kLineColumns][re % kLineColumns] = writes[im / kLineColumns][im % kLineColumns] = -1;
        }
        for (int i = 0; i < 2; ++i) reads_[i] = maskOf(reads[i]);
        for (int i = 0; i < kVectors; ++i) writes_[i] = maskOf(writes[i]);
    }

    QORI_INLINE ComplexLine read(const float* p) const {
        return {lanesAt(p, InLanes()), lanesAt(p + channels, InLanes())};
    }
    QORI_INLINE void write(float* p, ComplexLine a) const {
        writeVector<0>(p, a, InLanes());
        writeVector<1>(p, a, InLanes());
        if constexpr (kVectors == 3) writeVector<2>(p, a, InLanes());
    }

private:
    static constexpr int kVectors = (Places::kWritten + kLineColumns - 1) / kLineColumns;

    static __m256i maskOf(const int32_t* mask) { return _mm256_load_si256(reinterpret_cast<const __m256i*>(mask)); }
    template <int... lane>
    QORI_INLINE Vec<float> lanesAt(const float* p, std::integer_sequence<int, lane...>) const {
        const __m256 low = _mm256_maskload_ps(p, reads_[0]);
        const __m256 high = _mm256_maskload_ps(p + Places::second(), reads_[1]);
        return {__builtin_shufflevector(low, high, Places::readFrom(lane)...)};
    }
    template <int vector, int... e>
    QORI_INLINE void writeVector(float* p, ComplexLine a, std::integer_sequence<int, e...>) const {
        const __m256 both = __builtin_shufflevector(a.re.v, a.im.v, Places::writtenFrom(vector * kLineColumns + e)...);
        _mm256_maskstore_ps(p + vector * kLineColumns, writes_[vector], both);
    }

    __m256i reads_[2], writes_[kVectors];
};

/// Calls each(lanes) with those of the columns.
template <class Each>
void withChannelLanes(const LineColumns& columns, Each each) {
    if (columns.rows.channels == 4) return each(ChannelLanes<4, 0>(columns));
    switch (columns.channel) {
        case 0: return each(ChannelLanes<3, 0>(columns));
        case 1: return each(ChannelLanes<3, 1>(columns));
        default: return each(ChannelLanes<3, 2>(columns));
    }
}

}  // namespace qori::kernels::line
