// SPDX-License-Identifier: Apache-2.0
#pragma once

/// Inlined, as everything on the way of a signalling NaN: returning it in an x87 register would make it a quiet one.
#define QORI_KEEPS_NAN inline __attribute__((always_inline))
