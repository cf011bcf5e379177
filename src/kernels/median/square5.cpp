// SPDX-License-Identifier: Apache-2.0
#include "square5.h"

namespace qori::kernels {

QORI_ALL_SQUARES5()

}  // namespace qori::kernels
