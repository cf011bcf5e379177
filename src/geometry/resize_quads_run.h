// SPDX-License-Identifier: Apache-2.0
// Filtering the rows of a tile of three or four channels, four at once: one of the ways of resize_rows.h. See
// suitsQuads() for what they gain.
#pragma once
#include "kernels/resize/quads.h"
#include "resize_rows.h"

namespace qori::geometry {

template <class T, int channels>
class QuadRows {
public:
    /// Footprints of super-sampling are padded with zero weights, which must not meet infinities.
    static bool suits(const ResizePlan& plan) {
        constexpr bool isFloat = std::is_same_v<T, float>;
        if (isFloat && plan.interpolation == interpSuper) return false;
        return kernels::suitsQuads(plan.horizontal.ratio(), plan.columnTaps, channels, isFloat);
    }

    QuadRows(const TileSource<T, channels>& source, WorkBuffer& buffer)
        : source_(source),
          taps_(source, buffer),
          columns_(
              buffer.take<float>(kernels::quadColumnFloats(source.plan.horizontal.ratio(), source.plan.columnTaps))) {}

    int32_t stripPixels() const { return ringPixels(source_.plan, kAtOnce, channels); }
    static constexpr int32_t kAtOnce = kernels::kQuadRows;

    void begin() { taps_.list(source_); }
    void beginStrip(int32_t x, int32_t width) {
        filter_ = {taps_.strip(source_, x, width), kernels::quadGroup(source_.plan.horizontal.ratio()), columns_};
    }
    void filterNext(RowSequence& sequence, Ring& ring) {
        const T* rows[kAtOnce];
        float* out[kAtOnce];
        takeRows(source_, sequence, ring, rows, out);
        kernels::filterQuads<T, channels>(filter_, rows, out);
    }

private:
    const TileSource<T, channels>& source_;
    ColumnTaps<T, channels> taps_;
    float* columns_;
    kernels::QuadFilter filter_{};
};

}  // namespace qori::geometry
