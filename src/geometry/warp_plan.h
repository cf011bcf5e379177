// SPDX-License-Identifier: Apache-2.0
// The plan of an affine warp: a record in the caller's block, and what can be asked of it.
#pragma once
#include "frame/plan.h"
#include "geometry/tile.h"
#include "kernels/copy_rows.h"
#include "kernels/warp/places.h"

namespace qori::geometry {

/// (x, y) becomes (xx * x + xy * y + x0, yx * x + yy * y + y0).
struct Affine {
    double xx, xy, x0;
    double yx, yy, y0;

    static Affine of(const double coeffs[6]) {
        return {coeffs[0], coeffs[1], coeffs[2], coeffs[3], coeffs[4], coeffs[5]};
    }
    double determinant() const { return xx * yy - xy * yx; }
    Affine inverse() const;
    bool isFinite() const;
    /// As stated: products of the diagonals that differ by 1e-10 at most, in proportion to the first, or that are both
    /// next to nothing. Small quarter turns are among the latter. Beyond the statement, whatever has no finite inverse.
    bool isSingular() const;
};

/// What becomes of positions outside the source rectangle.
enum class WarpBorder : int32_t {
    constant,   ///< The border value.
    replicate,  ///< The nearest pixels.
    none        ///< They are not written, and taps are read from memory wherever they lie.
};

struct WarpPlan {
    static constexpr uint32_t kTag = 0x50524157;
    static constexpr int32_t kAffine = 0;

    uint32_t tag;
    int32_t transform, interpolation, dataType, channels;
    QorImageSize src, dst;
    WarpBorder border;
    QorResult status;     ///< QOR_WARN_WARP_EMPTY where there is nothing to be written, whatever the tile.
    int32_t movesPixels;  ///< Every position is a pixel's: nothing is interpolated.
    Affine forward, backward;
    double borderValues[4];
    kernels::CubicWeights cubic;
    kernels::Pattern fill;  ///< The border value as pixels.
};

inline constexpr int32_t kWarpPlanBytes = static_cast<int32_t>(sizeof(WarpPlan)) + kBlockAlignment;

/// Everything that an initialiser was given, checked.
struct WarpArguments {
    QorImageSize src, dst;
    int32_t interpolation, dataType, channels;
    Affine coefficients;
    bool isBackward;
    WarpBorder border;
    const double* borderValues;
    kernels::CubicWeights cubic;
    bool interpolates;  ///< A position that is a pixel's gives that pixel.
};

/// Returns the plan's status. Runs under the default control register.
QorResult fillWarpPlan(QorWarpPlan* block, const WarpArguments& arguments);

/// Columns first to end - 1 of a destination row.
struct WarpSpan {
    int32_t first, end;

    bool isEmpty() const { return first >= end; }
};

/// Lines and boxes of one plan.
class WarpGeometry {
public:
    /// `isNearest` where pixels are moved.
    WarpGeometry(const WarpPlan& plan, bool isNearest);

    kernels::WarpLine line(int32_t y) const;
    /// The columns whose positions lie in a box. Exact: it asks the positions that the kernels have.
    WarpSpan within(const kernels::WarpLine& line, const kernels::WarpBox& box, WarpSpan columns) const;

    double bias() const { return bias_; }
    /// Whether lines have fixed positions.
    bool isFixed() const { return isFixed_; }
    bool isNearest() const { return isNearest_; }
    /// Positions inside the source rectangle.
    kernels::WarpBox rectangle() const;

private:
    const WarpPlan& plan_;
    bool isNearest_, isFixed_, isSteep_;
    double bias_, shift_, inverseX_, inverseY_;
    uint64_t fixedAlongX_ = 0, fixedAlongY_ = 0;
};

}  // namespace qori::geometry
