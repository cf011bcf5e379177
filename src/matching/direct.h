// SPDX-License-Identifier: Apache-2.0
// Correlation by definition, tile by tile.
#pragma once
#include "kernels/correlation/crosses.h"
#include "template.h"
#include "window_sums.h"

namespace qori::matching {

using kernels::correlation::Pair;

template <class Cell>
class DirectWork {
public:
    DirectWork(const Problem& problem, bool isExact, WorkBuffer memory)
        : tile_(tileOf(problem)),
          pitch_(roundUp(tile_.width, kernels::correlation::kBlockCells<Cell>)),
          cellPitch_(pitch_ + roundUp(problem.tpl.width, kernels::correlation::kBlockCells<Cell>)),
          tapCells_((problem.tpl.width - 1) / kernels::correlation::kTapElements<Cell> + 1),
          taps(memory.take<Cell>(tapCells_ * problem.tpl.height)),
          cells(memory.take<Cell>(cellPitch_ * (tile_.height + problem.tpl.height - 1))),
          crosses(memory.take<Cell>(pitch_ * kernels::correlation::kCrossRows)),
          results(memory.take<double>(pitch_)),
          row(memory.take<double>(std::max<int64_t>(cellPitch_, problem.tpl.width) + 1)),
          sums(problem, problem.kind, tile_.width, tile_.height, isExact, memory),
          bytes_(memory.bytes()) {}

    int64_t bytes() const { return bytes_; }
    const Tile& tile() const { return tile_; }
    ptrdiff_t pitch() const { return static_cast<ptrdiff_t>(pitch_); }
    ptrdiff_t cellPitch() const { return static_cast<ptrdiff_t>(cellPitch_); }
    ptrdiff_t tapCells() const { return static_cast<ptrdiff_t>(tapCells_); }
    Cell* cellRow(int64_t i) const { return cells + static_cast<ptrdiff_t>(i * cellPitch_); }

private:
    /// Rows of a tile stay in the first-level cache, the patch in the second where the template leaves it a chance.
    static Tile tileOf(const Problem& problem) {
        constexpr int64_t kMostWidth = 4096 / sizeof(Cell), kLeastWidth = 32, kPatchCells = (512 << 10) / sizeof(Cell);
        const int64_t inRow = kPatchCells / (2 * int64_t{problem.tpl.height});
        const int64_t width = std::min(problem.width(), std::clamp(inRow - problem.tpl.width, kLeastWidth, kMostWidth));
        const int64_t rows = kPatchCells / (width + problem.tpl.width) - problem.tpl.height;
        constexpr int64_t kLeastRows = 8 * kernels::correlation::kCrossRows;
        return {0, 0, width, std::min(problem.height(), std::max(rows, kLeastRows))};
    }

    Tile tile_;
    int64_t pitch_, cellPitch_, tapCells_;

public:
    Cell* taps;
    Cell* cells;
    Cell* crosses;
    double* results;
    double* row;  ///< Of the template, or 16-bit elements of a row of cells.
    WindowSums<Cell> sums;

private:
    int64_t bytes_;
};

template <class T, class D, class Cell>
class Direct {
public:
    Direct(const Channel<T, D>& channel, DirectWork<Cell>& work)
        : channel_(channel), problem_(channel.problem), work_(work), known_(sumTemplate(channel, work.row)) {
        readTaps();
    }

    void run() {
        const Tile& most = work_.tile();
        for (int64_t y = 0; y < problem_.height(); y += most.height)
            for (int64_t x = 0; x < problem_.width(); x += most.width)
                runTile(
                    {x, y, std::min(most.width, problem_.width() - x), std::min(most.height, problem_.height() - y)});
    }

private:
    static constexpr bool isPair = kernels::correlation::isPair<Cell>;

    void readTaps() {
        const ptrdiff_t width = problem_.tpl.width;
        for (int32_t j = 0; j < problem_.tpl.height; ++j) {
            Cell* const taps = work_.taps + j * work_.tapCells();
            if constexpr (isPair) {
                readRow(channel_.tpl.row(j), {0, width, 0}, 0, work_.cells);
                for (ptrdiff_t i = 0; i < work_.tapCells(); ++i) taps[i] = work_.cells[2 * i];
            } else {
                readRow(channel_.tpl.row(j), {0, width, 0}, known_.offset, taps);
            }
        }
    }

    void readRow(const T* from, kernels::correlation::RowSpan span, double offset, Cell* cells) {
        if constexpr (isPair)
            kernels::correlation::readCells(from, channel_.channels, span, reinterpret_cast<int16_t*>(work_.row),
                                            cells);
        else
            kernels::correlation::readCells(from, channel_.channels, span, offset, cells);
    }

    void runTile(const Tile& tile) {
        const int64_t rows = tile.height + problem_.tpl.height - 1;
        const double offset = sourceOffset(channel_, tile);
        for (int64_t i = 0; i < rows; ++i) {
            auto span = channel_.span(tile, work_.cellPitch());
            const T* const from = channel_.patchRow(tile, i, span);
            readRow(from, span, offset, work_.cellRow(i));
        }
        for (int64_t y = 0; y < tile.height; y += kernels::correlation::kCrossRows)
            runRows(tile, y, std::min<int64_t>(kernels::correlation::kCrossRows, tile.height - y));
    }

    void runRows(const Tile& tile, int64_t y, int64_t count) {
        std::fill_n(work_.crosses, count * work_.pitch(), Cell{0});
        const int64_t height = problem_.tpl.height;
        for (int64_t i = 0; i < height + count - 1; ++i) {
            // Row y + i of the patch meets row i - k of the template in row y + k of the results.
            const int64_t first = std::max<int64_t>(i - height + 1, 0), last = std::min(i, count - 1);
            kernels::correlation::addCrosses(work_.crosses + first * work_.pitch(), work_.pitch(),
                                             static_cast<int>(last - first + 1), work_.cellRow(y + i),
                                             work_.taps + (i - first) * work_.tapCells(), work_.tapCells(),
                                             work_.tapCells(), static_cast<ptrdiff_t>(tile.width));
        }
        for (int64_t k = 0; k < count; ++k) {
            const auto sums = work_.sums.makeRow(y + k, tile.width, [&](int64_t i, int) { return work_.cellRow(i); });
            kernels::correlation::finishRow(known_.finish, work_.crosses + k * work_.pitch(), sums,
                                            static_cast<ptrdiff_t>(tile.width), work_.results);
            channel_.store(tile, y + k, work_.results);
        }
    }

    const Channel<T, D>& channel_;
    const Problem& problem_;
    DirectWork<Cell>& work_;
    TemplateSums known_;
};

}  // namespace qori::matching
