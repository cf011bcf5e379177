// SPDX-License-Identifier: Apache-2.0
// Linear interpolation in double precision.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

constexpr int kDoubles = 4;  ///< Elements to which filtered rows are padded.

/// out = (1 - f) * first + f * second, along a row. places[k][i] is where element i's neighbour k lies, in bytes from
/// the row's start; `padded` is a multiple of kDoubles.
template <int channels>
void linearRow64f(const double* row, const int32_t* const places[2], const double* fractions, ptrdiff_t padded,
                  double* out);

/// The same down a column of two padded rows.
void linearColumn64f(const double* h0, const double* h1, double fraction, double* dst, ptrdiff_t elements);

}  // namespace qori::kernels
