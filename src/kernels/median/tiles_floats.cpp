// SPDX-License-Identifier: Apache-2.0
#include "tiles_run.h"

template class qori::kernels::MedianTiles<int32_t>;
