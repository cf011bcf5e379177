// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <cstdint>

namespace qori::filter {

/// Of sizes and counts; for queries, whose arguments may name windows beyond any memory: saturates so far above every
/// size that is reported, and so far below 2^63, that some such products may be added and multiplied by a few bytes.
inline int64_t product(int64_t a, int64_t b) {
    constexpr int64_t kTooMuch = int64_t{1} << 40;
    return a != 0 && b > kTooMuch / a ? kTooMuch : a * b;
}

}  // namespace qori::filter
