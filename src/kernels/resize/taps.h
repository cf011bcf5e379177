// SPDX-License-Identifier: Apache-2.0
// Separable weighted sums in single precision. Eight rows are filtered at once: a chunk of their columns is turned so
// that a column's eight elements fill a vector, each result is a weighted sum of such vectors, and the results are
// turned back into rows. This costs the same for every ratio and number of channels, and reads no element twice.
//
// The order of resize_pairs.h: how an image is cut into tiles changes no bit.
#pragma once
#include "pairs.h"

namespace qori::kernels {

constexpr int kTapRows = 8;    ///< Rows filtered at once.
constexpr int kTapChunk = 32;  ///< Destination pixels whose results are turned back together.
constexpr int kTapBlock = 32;  ///< Elements to which filtered rows are padded.

/// What a destination pixel is made of, along a row.
struct PixelTaps {
    int32_t first;    ///< Source column of the first tap; columns outside the legal ones repeat the nearest.
    int32_t weights;  ///< Where its weights begin.
};

/// Weights of two taps: pairs of 1 - f and f.
void pairFractions(const float* fractions, int32_t count, float* pairs);

/// The taps of a strip's pixels.
struct StripTaps {
    const PixelTaps* pixels = nullptr;
    const float* weights = nullptr;
    int32_t taps = 0;
    int32_t width = 0;                      ///< Destination pixels.
    int32_t legalFirst = 0, legalLast = 0;  ///< Source columns that may be read.
};

struct RowFilter : StripTaps {
    int32_t group = 1;         ///< Destination pixels, at most kTapChunk, whose columns are turned together.
    int32_t period = 0;        ///< Pixels after which the weights repeat, or 0.
    bool isPadded = false;     ///< A last weight of 0 stands for no tap: there may be no such pixel.
    double scale = 1;          ///< Other than 1 for super-sampling: of results of more taps than a chain has.
    float* columns = nullptr;  ///< Room for the turned columns of a group: tapColumnFloats().
    float* results = nullptr;  ///< kTapChunk pixels of eight rows.
};

/// Pixels per group for a ratio and a number of taps: columns between the taps of distant pixels are not worth turning.
int32_t tapGroup(double ratio, int32_t taps);
/// Floats of RowFilter::columns.
int64_t tapColumnFloats(double ratio, int32_t taps, int channels);

/// Filters eight rows, each given by the address of source column 0, into rows of floats that hold whole blocks. The
/// last vector is filled up with zeros.
template <class T, int channels>
void filterRows(const RowFilter& filter, const T* const rows[kTapRows], float* const out[kTapRows]);

}  // namespace qori::kernels
