// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

/// dst[i] = 255 or 0 by bit `shift` + i of src, counted from the most significant bit of src[0]; shift is below 8.
/// Reads only the bytes that hold such bits.
void unpackBitsRow(uint8_t* dst, const uint8_t* src, int shift, ptrdiff_t pixels);

}  // namespace qori::kernels
