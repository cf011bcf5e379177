// SPDX-License-Identifier: Apache-2.0
// Blocks of a descriptor over a rectangle of blocks: a window's own, or all that overlapping windows share. Rows of
// cells go from the top, each in pieces of columns: gradients first, then the cells' histograms, which are added to
// the blocks that they belong to.
#pragma once
#include <algorithm>

#include "frame/row_window.h"
#include "hog_plan.h"
#include "kernels/hog/blocks.h"

namespace qori::features {

/// Blocks at multiples of the stride from a pixel of the area; block (x, y) goes to blocks + x * stepX + y * stepY.
struct BlockGrid {
    QorPoint2D origin;
    int32_t across, down;
    float* blocks;
    ptrdiff_t stepX, stepY;

    float* block(int32_t x, int32_t y) const { return blocks + x * stepX + y * stepY; }
};

/// Where blocks overlap, the stride is a cell and a cell belongs to up to four of them; else to one at most.
class CellAxis {
public:
    CellAxis(const HogPlan& plan, int32_t blocks)
        : cell_(plan.cellSize),
          stride_(plan.blockStride),
          blocks_(blocks),
          overlaps_(plan.blockStride == plan.cellSize) {}

    bool overlaps() const { return overlaps_; }
    int32_t count() const { return overlaps_ ? blocks_ + 1 : 2 * blocks_; }
    int32_t begin(int32_t i) const { return overlaps_ ? i * cell_ : i / 2 * stride_ + i % 2 * cell_; }
    int32_t end(int32_t i) const { return begin(i) + cell_; }
    /// The block in which the cell comes first (0) or second (1), or -1.
    int32_t block(int32_t i, int32_t place) const {
        if (!overlaps_) return i % 2 == place ? i / 2 : -1;
        const int32_t at = i - place;
        return at < blocks_ ? at : -1;
    }

private:
    int32_t cell_, stride_, blocks_;
    bool overlaps_;
};

/// The gradients of one piece of a row of cells.
inline constexpr int32_t kHogPiece = 256;

/// Bytes of work memory for them, at any alignment; regions are at most that wide. That is less than 12 bytes for each
/// pixel of the region, of which there are two rows of cells.
inline int64_t hogVoteBytes(const HogPlan& plan, int32_t width) {
    constexpr int64_t kBytes = 2 * elementBytes<float> + 1;
    return kBytes * (int64_t{plan.cellSize} * std::min(width, kHogPiece) + kernels::kHogBlock);
}

template <class T, int channels>
class HogBlocks {
public:
    /// area: the image with the rule for what lies around it. memory: hogVoteBytes().
    HogBlocks(const HogPlan& plan, const BorderedImage& area, uint8_t* memory)
        : plan_(plan), area_(area), binsPerRadian_(static_cast<float>(plan.nbins / 3.14159265358979323846)) {
        const int64_t pixels = int64_t{plan.cellSize} * std::min(area.size.width, kHogPiece) + kernels::kHogBlock;
        votes_.first = reinterpret_cast<float*>(memory);
        votes_.second = votes_.first + pixels;
        votes_.bin = reinterpret_cast<uint8_t*>(votes_.second + pixels);
    }

    void make(const BlockGrid& grid) {
        const CellAxis columns(plan_, grid.across), rows(plan_, grid.down);
        for (int32_t row = 0; row < rows.count(); ++row)
            for (int32_t first = 0; first < columns.count();) {
                const int32_t begin = columns.begin(first);
                int32_t last = first;
                while (last + 1 < columns.count() && columns.end(last + 1) - begin <= kHogPiece) ++last;
                const int32_t width = columns.end(last) - begin;
                vote({grid.origin.x + begin, grid.origin.y + rows.begin(row), width, plan_.cellSize});
                for (int32_t i = first; i <= last; ++i) {
                    const kernels::HogVotes votes = votes_.from(columns.begin(i) - begin);
                    if (columns.overlaps())
                        kernels::sumCell(votes, width, plan_.cellSize, plan_.nbins, plan_.weights(), shares_);
                    else
                        kernels::sumCellAt(i % 2 + row % 2 * 2, votes, width, plan_.cellSize, plan_.nbins,
                                           plan_.weights(), shares_);
                    share(grid, columns, i, rows, row);
                }
                first = last + 1;
            }
    }

private:
    /// Rows of the piece with their neighbours: those gathered at its sides, and one of constants.
    static constexpr int64_t kWindowBytes = (kHogPiece + 128) * channels * elementBytes<T>;

    /// The piece is an image whose sides are open where it does not end with the area.
    void vote(QorImageRect rect) {
        BorderedImage piece = area_;
        piece.origin = area_.pixel(rect.x, rect.y);
        piece.size = {rect.width, rect.height};
        piece.rule.open.left |= rect.x > 0;
        piece.rule.open.top |= rect.y > 0;
        piece.rule.open.right |= rect.x + rect.width < area_.size.width;
        piece.rule.open.bottom |= rect.y + rect.height < area_.size.height;
        alignas(64) uint8_t memory[kWindowBytes];
        RowWindow window(piece, {.reach = {1, 1, 1, 1}, .partPixels = kernels::kHogBlock}, memory);
        window.forEach([&](const WindowPart& part, int32_t y, int32_t) {
            const auto row = [&](int32_t at) { return part.row<T>(at) + channels; };
            kernels::hogVotes<channels>(row(y - 1), row(y), row(y + 1), votes_.from(ptrdiff_t{y} * rect.width + part.x),
                                        part.width, plan_.nbins, binsPerRadian_);
        });
    }

    void share(const BlockGrid& grid, const CellAxis& columns, int32_t column, const CellAxis& rows, int32_t row) {
        for (int32_t place = 0; place < 4; ++place) {
            const int32_t x = columns.block(column, place % 2), y = rows.block(row, place / 2);
            if (x < 0 || y < 0) continue;
            float* const block = grid.block(x, y);
            kernels::addShare(shares_, place, plan_.nbins, block);
            if (place == 3) kernels::finishBlock(block, plan_.nbins, plan_.threshold);
        }
    }

    const HogPlan& plan_;
    BorderedImage area_;
    float binsPerRadian_;
    kernels::HogVotes votes_;
    kernels::CellShares shares_;
};

}  // namespace qori::features
