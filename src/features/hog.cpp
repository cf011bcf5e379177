// SPDX-License-Identifier: Apache-2.0
// Histograms of oriented gradients of windows. Windows whose corners are whole strides apart share blocks: where they
// have more blocks together than the rectangle around them, that is computed once, in bands of rows as many as the
// buffer holds, and each window's descriptor is copied from it. Other windows are computed one by one. Either way a
// block comes about by the same operations.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/streaming.h"
#include "hog_blocks.h"
#include "kernels/copy_rows.h"

namespace qori::features {
namespace {

QorResult hogGetSize(const QorHogConfig* config, int32_t* size) {
    const QorResult checked = underDefaultControl([&] { return firstOf(nullCheck(size), configCheck(config)); });
    if (checked != QOR_OK) return checked;
    *size = static_cast<int32_t>(HogPlan::bytes(config->blockSize));
    return QOR_OK;
}

QorResult hogInit(const QorHogConfig* config, QorHogPlan* block) {
    if (QorResult r = firstOf(nullCheck(config, block))) return r;
    return underDefaultControl([&] {
        const QorResult checked = configCheck(config);
        if (checked == QOR_OK) fillHogPlan(reinterpret_cast<HogPlan*>(block), *config);
        return checked;
    });
}

const HogPlan* planOf(const QorHogPlan* block) { return reinterpret_cast<const HogPlan*>(block); }

QorResult windowCheck(const HogPlan& plan, QorImageSize roi) {
    return roi.width < plan.winWidth || roi.height < plan.winHeight ? QOR_ERR_SIZE : QOR_OK;
}

QorResult hogGetDescriptorSize(const QorHogPlan* block, int32_t* size) {
    if (QorResult r = nullCheck(block, size)) return r;
    const HogPlan* const plan = planOf(block);
    if (QorResult r = tagCheck(plan)) return r;
    return reportSize(plan->descriptorLength * elementBytes<float>, size);
}

/// Far above what 32 bits hold, fewer than there would be.
int64_t bufferBytes(QorImageSize roi) {
    const int64_t pixels = std::min(int64_t{roi.width} * roi.height, int64_t{1} << 50);
    return 3 * elementBytes<float> * pixels;
}

QorResult hogGetBufferSize(const QorHogPlan* block, QorImageSize roi, int32_t* size) {
    if (QorResult r = nullCheck(block, size)) return r;
    const HogPlan* const plan = planOf(block);
    if (QorResult r = firstOf(tagCheck(plan), windowCheck(*plan, roi))) return r;
    return reportSize(bufferBytes(roi), size);
}

struct Locations {
    const QorPoint2D* at;  ///< Null: one window at (0, 0).
    int32_t count;

    QorPoint2D operator[](int32_t i) const { return at == nullptr ? QorPoint2D{0, 0} : at[i]; }
};

/// Of windows that share a grid: in strides from its first pixel, the last ones included.
struct Range {
    int32_t firstX = INT32_MAX, firstY = INT32_MAX, lastX = -1, lastY = -1;
    int64_t count = 0;

    void add(int32_t x, int32_t y) {
        firstX = std::min(firstX, x), firstY = std::min(firstY, y);
        lastX = std::max(lastX, x), lastY = std::max(lastY, y);
        ++count;
    }
};

template <class T, int channels>
class HogJob {
public:
    HogJob(const HogPlan& plan, const BorderedImage& area, int64_t bytes, Locations locations, float* dst,
           uint8_t* buffer)
        : plan_(plan),
          area_(area),
          locations_(locations),
          dst_(dst),
          shared_(reinterpret_cast<float*>(buffer + hogVoteBytes(plan, area.size.width))),
          room_((bytes - hogVoteBytes(plan, area.size.width)) / elementBytes<float>),
          blocks_(plan, area, buffer) {}

    /// Windows by the pixel of a stride that they begin at. With strides too long for a table of these, which share
    /// little, one by one.
    void run() {
        const int32_t stride = plan_.blockStride;
        if (stride > kMostStride) {
            forAccepted([&](QorPoint2D at, float* to) { makeWindow(at, to); });
            return;
        }
        uint64_t phases[kMostStride] = {};
        int64_t accepted = 0;
        forAccepted([&](QorPoint2D at, float*) {
            phases[at.y % stride] |= uint64_t{1} << (at.x % stride);
            ++accepted;
        });
        isStreaming_ = accepted * plan_.descriptorLength >= kStreamFrom / elementBytes<float>;
        for (int32_t y = 0; y < stride; ++y)
            for (int32_t x = 0; x < stride; ++x)
                if (phases[y] >> x & 1) runPhase({x, y});
        if (isStreaming_) streamFence();
    }

private:
    static constexpr int32_t kMostStride = 64;
    /// Descriptors of so many bytes are stored past the cache: what is made first would be gone before it is read.
    static constexpr int64_t kStreamFrom = 4 << 20;

    /// visit(corner, destination) for each window within the area, in order.
    template <class Visit>
    void forAccepted(Visit visit) const {
        const int32_t mostX = area_.size.width - plan_.winWidth, mostY = area_.size.height - plan_.winHeight;
        float* to = dst_;
        for (int32_t i = 0; i < locations_.count; ++i) {
            const QorPoint2D at = locations_[i];
            if (at.x < 0 || at.y < 0 || at.x > mostX || at.y > mostY) continue;
            visit(at, to);
            to += plan_.descriptorLength;
        }
    }
    /// visit(x, y, destination), in strides, for those of a phase.
    template <class Visit>
    void forPhase(QorPoint2D phase, Visit visit) const {
        const int32_t stride = plan_.blockStride;
        forAccepted([&](QorPoint2D at, float* to) {
            if (at.x % stride == phase.x && at.y % stride == phase.y) visit(at.x / stride, at.y / stride, to);
        });
    }

    void runPhase(QorPoint2D phase) {
        Range all;
        forPhase(phase, [&](int32_t x, int32_t y, float*) { all.add(x, y); });
        const int64_t across = int64_t{all.lastX} - all.firstX + plan_.blocksAcross;
        const int64_t rows = room_ / (across * plan_.blockLength);
        const int64_t perBand = std::max(rows - plan_.blocksDown + 1, int64_t{0});
        if (all.lastY - all.firstY < perBand) return runBand(phase, all);
        if (perBand == 0) return makeEach(phase, all);
        for (int64_t y = all.firstY; y <= all.lastY; y += perBand) {
            Range band;
            forPhase(phase, [&](int32_t windowX, int32_t windowY, float*) {
                if (windowY >= y && windowY < y + perBand) band.add(windowX, windowY);
            });
            if (band.count > 0) runBand(phase, band);
        }
    }

    /// Windows within a range of rows, whose blocks the buffer holds.
    void runBand(QorPoint2D phase, const Range& band) {
        BlockGrid grid{pixelAt(phase, band.firstX, band.firstY), 0, 0, shared_, 0, 0};
        grid.across = band.lastX - band.firstX + plan_.blocksAcross;
        grid.down = band.lastY - band.firstY + plan_.blocksDown;
        const int64_t blocksOfWindows = band.count * plan_.blocksAcross * plan_.blocksDown;
        if (blocksOfWindows < int64_t{grid.across} * grid.down) return makeEach(phase, band);
        lay(grid);
        blocks_.make(grid);
        forPhase(phase, [&](int32_t x, int32_t y, float* to) {
            if (y >= band.firstY && y <= band.lastY) copyWindow(grid, x - band.firstX, y - band.firstY, to);
        });
    }

    void makeEach(QorPoint2D phase, const Range& range) {
        forPhase(phase, [&](int32_t x, int32_t y, float* to) {
            if (y >= range.firstY && y <= range.lastY) makeWindow(pixelAt(phase, x, y), to);
        });
    }

    QorPoint2D pixelAt(QorPoint2D phase, int32_t x, int32_t y) const {
        return {phase.x + x * plan_.blockStride, phase.y + y * plan_.blockStride};
    }

    void makeWindow(QorPoint2D at, float* to) {
        BlockGrid grid{at, plan_.blocksAcross, plan_.blocksDown, to, 0, 0};
        lay(grid);
        blocks_.make(grid);
    }

    /// Blocks in the plan's order.
    void lay(BlockGrid& grid) const {
        const ptrdiff_t length = plan_.blockLength;
        const bool byRows = plan_.blockOrder == 0;
        grid.stepX = byRows ? length : length * grid.down;
        grid.stepY = byRows ? length * grid.across : length;
    }

    /// A window's row of blocks, or its column, lies in the grid in one piece.
    void copyWindow(const BlockGrid& grid, int32_t x, int32_t y, float* to) const {
        const bool byRows = plan_.blockOrder == 0;
        const int32_t lines = byRows ? plan_.blocksDown : plan_.blocksAcross;
        const ptrdiff_t length = ptrdiff_t{byRows ? plan_.blocksAcross : plan_.blocksDown} * plan_.blockLength;
        const float* from = grid.block(x, y);
        for (int32_t i = 0; i < lines; ++i, to += length, from += byRows ? grid.stepY : grid.stepX) {
            if (isStreaming_)
                kernels::streamFloats(to, from, length);
            else
                kernels::copyRow(asBytes(to), asBytes(from), length * elementBytes<float>);
        }
    }

    const HogPlan& plan_;
    BorderedImage area_;
    Locations locations_;
    float* dst_;
    float* shared_;  ///< What the buffer has behind the memory for gradients.
    int64_t room_;   ///< Of it, in floats.
    bool isStreaming_ = false;
    HogBlocks<T, channels> blocks_;
};

QorResult kindCheck(Border border) {
    return border.isOneOf(BorderKind::constant, BorderKind::replicate, BorderKind::mirror, BorderKind::readAll)
               ? QOR_OK
               : QOR_ERR_BORDER;
}

template <class T, Layout layout>
QorResult hog(Image<const T> src, QorImageSize roi, Locations locations, float* dst, const QorHogPlan* block,
              int32_t borderType, const T* borderValue, uint8_t* buffer) {
    if (QorResult r = nullCheck(block, src, dst, buffer)) return r;
    const HogPlan& plan = *planOf(block);
    const Border border = Border::of(borderType);
    const QorResult checked =
        firstOf(tagCheck(&plan), stepCheck(src), alignedStepCheck(src), windowCheck(plan, roi),
                locations.count < 1 ? QOR_ERR_BAD_ARG : QOR_OK,
                locations.at == nullptr && locations.count >= 2 ? QOR_ERR_NULL_PTR : QOR_OK, kindCheck(border),
                border.kind == BorderKind::constant ? nullCheck(borderValue) : QOR_OK);
    if (checked != QOR_OK) return checked;
    // The area that whole strides of blocks tile.
    const auto trim = [&](int32_t side) {
        return (side - plan.blockSize) / plan.blockStride * plan.blockStride + plan.blockSize;
    };
    const BorderedImage area{asBytes(src.data),
                             src.step,
                             {trim(roi.width), trim(roi.height)},
                             pixelSize<T, layout>,
                             BorderRule::withMirror(border, borderValue)};
    return underDefaultControl([&] {
        HogJob<T, channels(layout)>(plan, area, bufferBytes(roi), locations, dst, buffer).run();
        return QOR_OK;
    });
}

}  // namespace
}  // namespace qori::features

#include "entries/hog.inc"
