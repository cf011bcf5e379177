// SPDX-License-Identifier: Apache-2.0
// How a tile of a warp is made, whatever its pixels are.
#pragma once
#include "warp_plan.h"

namespace qori::geometry {

/// Images as bytes.
struct WarpImages {
    const uint8_t* src;  ///< Pixel (0, 0) of the source.
    int32_t srcStep;
    uint8_t* dst;  ///< The tile's first pixel.
    int32_t dstStep;
    int32_t pixelBytes;
};

/// The kernels are those of the nearest pixel where the plan moves pixels.
void runWarpTile(const WarpPlan& plan, bool isNearest, const kernels::WarpKernels& kernels, const WarpImages& images,
                 Tile tile);

}  // namespace qori::geometry
