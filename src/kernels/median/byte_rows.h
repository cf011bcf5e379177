// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

/// Bytes of a strip of columns: row y's begin at data + y * step and lie `apart` from each other.
struct ByteRows {
    const uint8_t* data;
    ptrdiff_t step, apart;

    const uint8_t* row(ptrdiff_t y) const { return data + y * step; }
};

}  // namespace qori::kernels
