// SPDX-License-Identifier: Apache-2.0
// The pixels that are moved whole: QORI_FOR_EACH_PIXEL(M) is M(bytes, keepAlpha); for each.
#pragma once

#define QORI_FOR_EACH_PIXEL(M) \
    M(1, false);               \
    M(2, false);               \
    M(3, false);               \
    M(4, false);               \
    M(6, false);               \
    M(8, false);               \
    M(12, false);              \
    M(16, false);              \
    M(4, true);                \
    M(8, true);                \
    M(16, true);
