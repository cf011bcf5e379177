// SPDX-License-Identifier: Apache-2.0
#include "joins_run.h"

namespace qori::kernels {

const Joins<uint8_t> kByteJoins[2] = {detail::joinsOf<Extreme<uint8_t, uint8_t, false>>(),
                                      detail::joinsOf<Extreme<uint8_t, uint8_t, true>>()};

}  // namespace qori::kernels
