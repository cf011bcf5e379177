// SPDX-License-Identifier: Apache-2.0
// Separable weighted sums of bytes in integers. Weights count 2^-14 and those of a result sum to 2^14; rows between the
// two passes hold 2^7 times the distance from 128, so that overshoots of half the range fit 16 bits.
#pragma once
#include "taps.h"

namespace qori::kernels {

constexpr int32_t kWordTaps = 16;   ///< At most, in either direction.
constexpr int kWordBlock = 32;      ///< Elements to which rows between the passes are padded.
constexpr double kWordRatio = 4;    ///< At most: four neighbouring elements then find a pair of taps within 16 bytes.
constexpr double kWordGain = 1.98;  ///< Above the sum of the magnitudes of a result's weights.

/// Sixteen results of a row, in two octets of two quads. A quad is made of windows of 16 bytes; those of the next two
/// taps begin two pixels on and are shuffled alike.
struct WordGroup {
    alignas(kVectorBytes) uint8_t masks[2][32];  ///< Per octet: two quads.
    int32_t bases[2][2];                         ///< Where the quads' first windows begin in the line.
};

struct WordFilter {
    static constexpr int kOverrun = 32;  ///< Bytes behind a line's last that may be read.

    int32_t taps = 0, channels = 0;  ///< An even number of taps.
    ptrdiff_t groups = 0;
    WordGroup* list = nullptr;
    int16_t* weights = nullptr;  ///< Per group, octet and pair of taps: eight pairs.
    bool shared = false;         ///< The quads of each octet have one window.
    int32_t cycle = 0;           ///< So many groups on, all but the last differ in one step of all bases only.
    bool repeats = false;        ///< That the cycle holds.
};

/// Bytes of WordFilter::weights per group.
constexpr ptrdiff_t wordGroupBytes(int32_t taps) { return ptrdiff_t{32} * taps; }

/// Rounds `taps` weights times `scale` to 2^-14. The largest takes what the others' rounding leaves.
void roundWeights(const float* weights, int32_t taps, float scale, int16_t* out);

/// The weights of pixels.
struct GivenWeights {
    const float* table;
    int32_t taps;    ///< Of each; they may be one less than the filter's.
    float scale;     ///< Their factor.
    int32_t period;  ///< Pixels after which weights repeat and their columns go on by one step, or 0.
};

/// Fills the filter's tables for `width` pixels; the line begins at source column `origin`. Of tables that repeat only
/// those at the ends are made.
void listWords(WordFilter& filter, const PixelTaps* pixels, int32_t width, const GivenWeights& weights, int32_t origin);

/// Two lines, and the memory of two rows that will be needed soon: it is asked for, not read.
struct WordLines {
    const uint8_t *first, *second, *laterFirst, *laterSecond;
};

/// Filters two lines into a row of pairs, in the order that filterWordColumn() wants.
void filterWords(const WordFilter& filter, WordLines lines, int16_t* out);

/// dst = the sum of pairs of rows by their weights, rounded to nearest, ties to even, and saturated. `count` is the
/// number of pairs, one more than half of kWordTaps at most.
void filterWordColumn(const int16_t* const* pairs, const int16_t* weights, int32_t count, uint8_t* dst,
                      ptrdiff_t elements);

/// Copies a row and repeats its first and last pixel at the ends.
void padLine(const uint8_t* row, ptrdiff_t elements, int32_t left, int32_t right, int channels, uint8_t* line);

}  // namespace qori::kernels
