// SPDX-License-Identifier: Apache-2.0
// Weighted sums along a row for the simplest ratios, of one channel: S source columns make one or two results, then S
// more. The source row lies as S streams of floats, stream s holding the columns s, s + S, s + 2S and so on; results
// that lie a period apart take each tap from neighbours in one stream, so that nothing is gathered. The sums are those
// of resize_taps.h, bit for bit.
#pragma once
#include "pairs.h"

namespace qori::kernels {

struct PhaseFilter {
    static constexpr int kMostStreams = 4, kMostPhases = 2;
    static constexpr int kVectors = 2 * kPairVectors;
    static constexpr int kBlock = 8 * kVectors;               ///< Results made at once; rows of them hold whole blocks.
    static constexpr int kBefore = 8, kBehind = kBlock + 16;  ///< Floats around what a stream is asked for.

    int streams = 1, phases = 1;
    PairedTaps taps{};                 ///< Of the first results of each phase.
    ptrdiff_t streamFloats = 0;        ///< From one stream's start to the next one's.
    const int32_t* offsets = nullptr;  ///< Of each tap from the line's start.

    /// Where column `column` lies, counted from the one that the first stream begins with; a little below 0 is in
    /// order.
    ptrdiff_t place(ptrdiff_t column) const {
        const ptrdiff_t period = column < 0 ? -((streams - 1 - column) / streams) : column / streams;
        return kBefore + (column - period * streams) * streamFloats + period;
    }
};

/// Room for a line of so many columns in each stream.
constexpr int64_t streamFloats(int64_t columns, int streams) {
    return (columns / streams + PhaseFilter::kBefore + PhaseFilter::kBehind + 7) / 8 * 8;
}

/// The columns that a strip's taps reach: so many from the row's pointer on, of `legal` that may be read, the first
/// repeated `left` times before them and the last `right` times behind.
struct LineEnds {
    ptrdiff_t elements, legal;
    int32_t left, right;
};

/// Converts and deals out columns.
template <class T>
void dealOut(const PhaseFilter& filter, const T* row, const LineEnds& ends, float* line);

/// Makes `results` results, up to whole blocks. `later` is the memory of the row that will be dealt out next; it is
/// asked for, not read.
void filterPhases(const PhaseFilter& filter, const float* line, const uint8_t* later, int elementBytes,
                  ptrdiff_t results, float* out);

}  // namespace qori::kernels
