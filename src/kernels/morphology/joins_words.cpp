// SPDX-License-Identifier: Apache-2.0
#include "joins_run.h"

namespace qori::kernels {

const Joins<uint16_t> kWordJoins[2] = {detail::joinsOf<Extreme<uint16_t, uint16_t, false>>(),
                                       detail::joinsOf<Extreme<uint16_t, uint16_t, true>>()};
const Joins<uint16_t> kSignedWordJoins[2] = {detail::joinsOf<Extreme<uint16_t, int16_t, false>>(),
                                             detail::joinsOf<Extreme<uint16_t, int16_t, true>>()};

}  // namespace qori::kernels
