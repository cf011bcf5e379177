// SPDX-License-Identifier: Apache-2.0
// Correlation by transforms, tile by tile: overlapping patches of the source are correlated cyclically, and what has
// gone round is left out (overlap-save). The patches of two tiles are the real and the imaginary parts of one plane: a
// template of real numbers keeps them apart.
#pragma once
#include <bit>

#include "kernels/correlation/spectra.h"
#include "template.h"
#include "window_sums.h"

namespace qori::matching {

/// How a problem is cut into tiles, and what that costs in about nanoseconds.
struct TransformPlan {
    int64_t width = 0, height = 0;  ///< Lengths of the transforms.
    int64_t tileWidth = 0, tileHeight = 0;
    double cost = 0;

    explicit TransformPlan(const Problem& problem) {
        for (int64_t across = 1; across <= kMostParts; across += 1 + across / 4) {
            const int64_t w = lengthOf(problem.width(), across, problem.tpl.width);
            for (int64_t down = 1; down <= kMostParts; down += 1 + down / 4) {
                consider(problem, w, lengthOf(problem.height(), down, problem.tpl.height));
                if (problem.height() / down < problem.tpl.height / 4) break;
            }
            if (problem.width() / across < problem.tpl.width / 4) break;
        }
    }

private:
    static constexpr int64_t kMostParts = 64;
    /// Points from which on memory counts for more than time.
    static constexpr double kManyPoints = 1 << 20;

    static int64_t lengthOf(int64_t results, int64_t parts, int64_t length) {
        return kernels::correlation::LineTransform::lengthFrom((results - 1) / parts + length);
    }

    void consider(const Problem& problem, int64_t w, int64_t h) {
        const int64_t tileW = std::min(problem.width(), w - problem.tpl.width + 1);
        const int64_t tileH = std::min(problem.height(), h - problem.tpl.height + 1);
        const int64_t tiles = ((problem.width() - 1) / tileW + 1) * ((problem.height() - 1) / tileH + 1);
        const double points = static_cast<double>(w) * static_cast<double>(h);
        const auto bits =
            static_cast<int>(std::bit_width(static_cast<uint64_t>(w)) + std::bit_width(static_cast<uint64_t>(h))) - 1;
        const double perTransform = points * (1.5 + 0.25 * bits);
        double total = perTransform * (1 + 2 * static_cast<double>((tiles + 1) / 2));
        if (points > kManyPoints) total *= points / kManyPoints;
        if (width == 0 || total < cost) *this = TransformPlan(w, h, tileW, tileH, total);
    }

    TransformPlan(int64_t w, int64_t h, int64_t tileW, int64_t tileH, double total)
        : width(w), height(h), tileWidth(tileW), tileHeight(tileH), cost(total) {}
};

class TransformWork {
public:
    static constexpr int kTiles = 2;  ///< In the parts of one plane.

    TransformWork(const Problem& problem, bool isExact, WorkBuffer memory)
        : plan(problem),
          rows(plan.width),
          columns(plan.height),
          planePitch_(plan.width * kernels::correlation::kLineDoubles + kQuadPadding),
          rowTables_(memory.take<double>(kernels::correlation::LineTransform::tableDoubles(plan.width))),
          columnTables_(memory.take<double>(kernels::correlation::LineTransform::tableDoubles(plan.height))),
          plane_(memory.take<double>(planePitch_ * plan.height / kernels::correlation::kQuad)),
          spectrum(memory.take<double>(2 * plan.width * plan.height)),
          lines(memory.take<double>(plan.height * kernels::correlation::kLineDoubles)),
          strips(memory.take<double>(plan.width * kernels::correlation::kLineDoubles)),
          slots(memory.take<double>(2 * plan.width)),
          results(memory.take<double>(plan.width)),
          sums{{problem, sumsKind(problem, isExact), plan.tileWidth, plan.tileHeight, isExact, memory},
               {problem, sumsKind(problem, isExact), plan.tileWidth, plan.tileHeight, isExact, memory}},
          bytes_(memory.bytes()) {}

    int64_t bytes() const { return bytes_; }
    void makeTables() {
        rows.makeTables(rowTables_);
        columns.makeTables(columnTables_);
    }
    kernels::correlation::Quads quads(int64_t patchRows) const {
        const int64_t count = (patchRows - 1) / kernels::correlation::kQuad + 1;
        return {plane_, static_cast<ptrdiff_t>(planePitch_), static_cast<ptrdiff_t>(count)};
    }
    ptrdiff_t width() const { return static_cast<ptrdiff_t>(plan.width); }

    TransformPlan plan;
    kernels::correlation::LineTransform rows, columns;

private:
    /// Quads whose distance is a power of two would share few sets of a cache.
    static constexpr int64_t kQuadPadding = 4 * kernels::correlation::kLineDoubles;

    /// Sums of floats show where a window is too faint for the transform, of plain correlations too.
    static Kind sumsKind(const Problem& problem, bool isExact) {
        return problem.kind == Kind::plain && !isExact ? Kind::norm : problem.kind;
    }

    int64_t planePitch_;
    double *rowTables_, *columnTables_, *plane_;

public:
    double *spectrum, *lines;
    double* strips;  ///< Four rows of both tiles.
    double* slots;   ///< Two rows of cells.
    double* results;
    WindowSums<double> sums[kTiles];

private:
    int64_t bytes_;
};

template <class T, class D>
class Transform {
public:
    /// The work's tables are made.
    Transform(const Channel<T, D>& channel, TransformWork& work)
        : channel_(channel), problem_(channel.problem), work_(work), known_(sumTemplate(channel, work.slots)) {
        makeSpectrum();
    }

    void run() {
        const int64_t across = (problem_.width() - 1) / work_.plan.tileWidth + 1;
        const int64_t all = across * ((problem_.height() - 1) / work_.plan.tileHeight + 1);
        for (int64_t i = 0; i < all; i += TransformWork::kTiles) {
            Tile tiles[TransformWork::kTiles];
            const int count = static_cast<int>(std::min<int64_t>(TransformWork::kTiles, all - i));
            for (int k = 0; k < count; ++k) tiles[k] = tileAt((i + k) % across, (i + k) / across);
            runTiles(tiles, count);
        }
    }

private:
    static constexpr int kQuad = kernels::correlation::kQuad;
    /// Errors of a transform's results, in units of 2^-53 times the norms of the patches and of the template: about the
    /// logarithm of the points, of which no more than this was seen; and what a normalised result may be off by.
    static constexpr double kErrors = 16, kTolerance = std::is_same_v<D, double> ? 1e-10 : 5e-7;

    Tile tileAt(int64_t i, int64_t j) const {
        const int64_t x = i * work_.plan.tileWidth, y = j * work_.plan.tileHeight;
        return {x, y, std::min(work_.plan.tileWidth, problem_.width() - x),
                std::min(work_.plan.tileHeight, problem_.height() - y)};
    }
    int64_t patchRows(const Tile& tile) const { return tile.height + problem_.tpl.height - 1; }
    double* strip(int tile, int64_t row = 0) const {
        return work_.strips + static_cast<ptrdiff_t>((tile * kQuad + row) * work_.plan.width);
    }

    void makeSpectrum() {
        const auto quads = work_.quads(problem_.tpl.height);
        std::fill_n(work_.strips, 2 * kQuad * work_.plan.width, 0.0);
        for (ptrdiff_t q = 0; q < quads.count; ++q) {
            for (int k = 0; k < kQuad; ++k) {
                const ptrdiff_t j = q * kQuad + k;
                if (j < problem_.tpl.height)
                    readTaps(j, strip(0, k));
                else
                    std::fill_n(strip(0, k), problem_.tpl.width, 0.0);
            }
            transformRows(quads, q);
        }
        const double scale = 1 / (static_cast<double>(work_.plan.width) * static_cast<double>(work_.plan.height));
        kernels::correlation::makeSpectrum(work_.columns, quads, work_.width(), scale, work_.spectrum);
    }

    void readTaps(int64_t row, double* taps) const {
        kernels::correlation::readCells(channel_.tpl.row(static_cast<int32_t>(row)), channel_.channels,
                                        {0, problem_.tpl.width, 0}, known_.offset, taps);
    }

    void transformRows(kernels::correlation::Quads quads, ptrdiff_t q) {
        double* const lines = quads.first + q * quads.pitch;
        kernels::correlation::rowsToLines(strip(0), strip(1), work_.width(), work_.width(), lines);
        work_.rows.forth(lines);
    }

    double* readRow(const Tile& tile, int64_t row, double offset, ptrdiff_t total, double* cells) const {
        auto span = channel_.span(tile, total);
        const T* const from = channel_.patchRow(tile, row, span);
        kernels::correlation::readCells(from, channel_.channels, span, offset, cells);
        return cells;
    }

    void runTiles(const Tile* tiles, int count) {
        double offsets[TransformWork::kTiles] = {}, squares = 0;
        int64_t rows = 0;
        for (int k = 0; k < count; ++k) {
            offsets[k] = sourceOffset(channel_, tiles[k]);
            rows = std::max(rows, patchRows(tiles[k]));
        }
        const auto quads = work_.quads(rows);
        for (ptrdiff_t q = 0; q < quads.count; ++q) {
            for (int k = 0; k < TransformWork::kTiles; ++k)
                for (int i = 0; i < kQuad; ++i) {
                    if (k >= count) {
                        std::fill_n(strip(k, i), work_.plan.width, 0.0);
                        continue;
                    }
                    const double* const cells =
                        readRow(tiles[k], q * kQuad + i, offsets[k], work_.width(), strip(k, i));
                    if (!kIsExact<T>) squares += kernels::correlation::sumOfSquares(cells, work_.width());
                }
            transformRows(quads, q);
        }
        const int64_t height = std::max(tiles[0].height, tiles[count - 1].height);
        const auto wanted = work_.quads(height);
        kernels::correlation::correlateColumns(work_.columns, quads, work_.width(), work_.spectrum, work_.lines,
                                               wanted.count);
        const double faintest = kErrors * 0x1p-53 / kTolerance;
        for (ptrdiff_t q = 0; q < wanted.count; ++q) {
            double* const lines = wanted.first + q * wanted.pitch;
            work_.rows.back(lines);
            kernels::correlation::linesToRows(lines, work_.width(), kIsExact<T>, strip(0), strip(1), work_.width());
            for (int k = 0; k < count; ++k)
                for (int64_t i = 0; i < kQuad && q * kQuad + i < tiles[k].height; ++i)
                    finish(k, tiles[k], q * kQuad + i, offsets[k], faintest * faintest * squares);
        }
    }

    /// Windows whose energy is below `faintest` are summed by definition.
    void finish(int k, const Tile& tile, int64_t y, double offset, double faintest) {
        const auto width = static_cast<ptrdiff_t>(tile.width);
        const ptrdiff_t columns = width + problem_.tpl.width - 1;
        double* const crosses = strip(k, y % kQuad);
        const auto sums = work_.sums[k].makeRow(y, width, [&](int64_t row, int slot) {
            return readRow(tile, row, offset, columns, work_.slots + slot * work_.width());
        });
        if (!kIsExact<T>) {
            ptrdiff_t x = -1;
            while ((x = kernels::correlation::nextFaint(known_.finish, sums, faintest, x + 1, width)) < width)
                crosses[x] = crossOf(tile, x, y, offset);
        }
        kernels::correlation::finishRow(known_.finish, crosses, sums, width, work_.results);
        channel_.store(tile, y, work_.results);
    }

    double crossOf(const Tile& tile, ptrdiff_t x, int64_t y, double offset) const {
        const Tile window{tile.x + x, tile.y + y, 1, 1};
        double* const taps = work_.slots + work_.width();
        double sum = 0;
        for (int64_t j = 0; j < problem_.tpl.height; ++j) {
            const double* const cells = readRow(window, j, offset, problem_.tpl.width, work_.slots);
            readTaps(j, taps);
            for (ptrdiff_t i = 0; i < problem_.tpl.width; ++i) sum += cells[i] * taps[i];
        }
        return sum;
    }

    const Channel<T, D>& channel_;
    const Problem& problem_;
    TransformWork& work_;
    TemplateSums known_;
};

}  // namespace qori::matching
