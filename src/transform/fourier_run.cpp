// SPDX-License-Identifier: Apache-2.0
// Rows and columns in turn, rows first on the way forward and last on the way back. Between them the destination holds
// rows of spectra in an order of their own: of an even width frequency 0, frequency W / 2, then the parts of 1, 2, ...,
// so that the two real columns are one complex column and all pairs are aligned; of an odd width the packed order.
#include "fourier_run.h"

#include <algorithm>

#include "kernels/transform/pixel_rows.h"

namespace qori::transform {
namespace {

using kernels::LineColumns;
using kernels::LineRows;
using kernels::Parts;

constexpr int kColumns = kernels::kLineColumns;

/// The buffer's pieces.
struct Work {
    float *lines, *work;
    float* saved;  ///< The last column of each channel.

    Work(const FourierPlan& plan, uint8_t* buffer)
        : lines(reinterpret_cast<float*>(buffer)),
          work(tableOf<float>(buffer, plan.workAt)),
          saved(tableOf<float>(buffer, plan.savedAt)) {}
};

LineRows rowsOf(const float* image, int32_t step, const Images& images, int32_t y, int count) {
    // Kernels that read take the same description as those that write.
    return {asBytes(const_cast<float*>(image)) + ptrdiff_t{y} * step, step, count, images.channels, images.processed};
}

/// Calls each(source rows, destination rows) for so many rows at a time.
template <class Each>
void forEachRows(const FourierPlan& plan, const Images& images, int most, Each each) {
    for (int32_t y = 0; y < plan.size.height; y += most) {
        const int count = std::min(most, plan.size.height - y);
        each(rowsOf(images.src, images.srcStep, images, y, count),
             rowsOf(images.dst, images.dstStep, images, y, count));
    }
}

enum class Towards { left, right };

/// Blocks go from one side to the other, each a cache line of every row, which no prefetcher sees coming: the next one
/// is asked for, unless the image is in a second-level cache.
LineColumns towards(Towards side, LineColumns block) {
    constexpr ptrdiff_t cached = 1 << 21, line = 2 * kColumns;
    if (block.rows.count * block.rows.step > cached) block.ahead = side == Towards::left ? -line : 2 * line - 1;
    return block;
}

/// Complex columns of a real image's spectra, the real ones being one of them, of each channel.
class SpectrumColumns {
public:
    SpectrumColumns(const FourierPlan& plan, const float* image, int32_t step, const Images& images)
        : width_(plan.size.width), rows_(rowsOf(image, step, images, 0, plan.size.height)) {}

    int32_t blocks() const { return (all() + kColumns - 1) / kColumns; }
    /// Lanes of block b. In the packed order the first columns of block 0 are no pairs.
    LineColumns packed(int32_t b) const { return columns(b, -rows_.channels, b == 0 ? rows_.channels : 0); }
    LineColumns between(int32_t b) const { return width_ % 2 == 1 ? packed(b) : columns(b, 0, 0); }
    bool hasLastColumn() const { return width_ % 2 == 0; }
    LineRows column(int32_t x, int channel) const {
        LineRows rows = rows_;
        rows.first = asBytes(rows.row(0) + ptrdiff_t{x} * rows.channels + channel);
        return rows;
    }
    /// Of an image that has no others.
    kernels::ColumnPair onlyColumns(int channel) const {
        kernels::ColumnPair pair{column(0, channel), column(width_ - 1, channel)};
        if (!hasLastColumn()) pair.second.count = 0;
        return pair;
    }
    /// Calls each(channel) for those that are processed.
    template <class Each>
    void forEachChannel(Each each) const {
        for (int c = 0; c < rows_.processed; ++c) each(c);
    }

    /// Where the only block has lanes left for one more column of each channel, the first of them, else 0.
    int freeLane() const { return all() + rows_.channels <= kColumns ? kColumns - rows_.channels : 0; }

    /// Whether the two real columns of a channel share a lane.
    bool areJoined() const { return hasLastColumn() && freeLane() == 0; }

private:
    int32_t all() const { return (width_ / 2 + width_ % 2) * rows_.channels; }
    LineColumns columns(int32_t b, ptrdiff_t first, int begin) const {
        const int32_t column = b * kColumns, channel = column % rows_.channels;
        return {rows_, first + 2 * ptrdiff_t{column - channel} + channel, begin, std::min(kColumns, all() - column),
                channel};
    }

    int32_t width_;
    LineRows rows_;
};

/// The saved column of a channel, and the same as one of an image.
float* savedOf(const FourierPlan& plan, const Work& w, int channel) {
    return w.saved + ptrdiff_t{channel} * plan.size.height;
}
LineRows savedColumn(const FourierPlan& plan, const Work& w, int channel) {
    return {asBytes(savedOf(plan, w, channel)), elementBytes<float>, plan.size.height, 1, 1};
}

/// Calls each(lines) for those of every channel that is processed.
template <class Each>
void forEachLines(const FourierPlan& plan, const Images& images, float* lines, Each each) {
    const ptrdiff_t floats = ptrdiff_t{plan.rows()->points} * kernels::kLineFloats;
    for (int c = 0; c < images.processed; ++c) each(lines + c * floats);
}

/// Odd rows go in pairs, as the parts of complex ones, which costs half and has a rounding more. Where there are no
/// more rows than lanes, or where that is a larger part of the errors and rows are short, they go alone.
bool areAlone(QorImageSize size) { return size.height <= kColumns || size.width <= 31; }

/// Even rows of four channels.
void forwardPixelRows(const FourierPlan& plan, const Images& images, const Work& w) {
    const kernels::FourierTable* const table = plan.rows();
    const int32_t* const positions = table->positions();
    const int32_t width = plan.size.width;
    forEachRows(plan, images, kernels::kPixelRows, [&](const LineRows& src, const LineRows& dst) {
        kernels::pixelsToLines(src, width, plan.rowForward, w.lines);
        kernels::transformLines(table, w.lines, w.work);
        if (!plan.hasWideHalves()) return kernels::halvesToPixels(w.lines, width, positions, plan.roots(), dst);
        kernels::splitWideHalves(w.lines, width, positions, plan.wideRoots());
        kernels::linesToPixels(w.lines, positions, width, Parts::inOrder, dst);
    });
}

void inversePixelRows(const FourierPlan& plan, const Images& images, const Work& w) {
    const kernels::FourierTable* const table = plan.rows();
    const int32_t width = plan.size.width;
    forEachRows(plan, images, kernels::kPixelRows, [&](const LineRows&, const LineRows& dst) {
        if (plan.hasWideHalves()) {
            kernels::pixelsToLines(dst, width, plan.rowInverse, w.lines);
            kernels::joinWideHalves(w.lines, width, plan.wideRoots());
        } else
            kernels::pixelsToHalves(dst, width, plan.rowInverse, plan.roots(), w.lines);
        kernels::transformLines(table, w.lines, w.work);
        kernels::linesToPixels(w.lines, table->positions(), width, Parts::exchanged, dst);
    });
}

void forwardRealRows(const FourierPlan& plan, const Images& images, const Work& w) {
    if (plan.halfRoots != 0 && images.channels == 4) return forwardPixelRows(plan, images, w);
    const kernels::FourierTable* const table = plan.rows();
    const int32_t width = plan.size.width;
    if (plan.hasShortRows)
        forEachRows(plan, images, kColumns, [&](const LineRows& src, const LineRows& dst) {
            kernels::shortRowsToSpectra(plan.shortRows(), src, plan.rowForward, w.lines, dst);
        });
    else if (plan.halfRoots != 0)
        forEachRows(plan, images, kColumns, [&](const LineRows& src, const LineRows& dst) {
            kernels::rowsToLines(src, width, plan.rowForward, Parts::inOrder, w.lines);
            const bool isWide = plan.hasWideHalves();
            forEachLines(plan, images, w.lines, [&](float* lines) {
                kernels::transformLines(table, lines, w.work);
                if (isWide) kernels::splitWideHalves(lines, width, table->positions(), plan.wideRoots());
            });
            if (isWide)
                kernels::linesToRows(w.lines, table->positions(), width, Parts::inOrder, dst);
            else
                kernels::halvesToRows(w.lines, width, table->positions(), plan.roots(), dst);
        });
    else {
        const bool alone = areAlone(plan.size);
        forEachRows(plan, images, alone ? kColumns : 2 * kColumns, [&](const LineRows& src, const LineRows& dst) {
            kernels::rowsToPairs(src, width, plan.rowForward, alone, w.lines);
            forEachLines(plan, images, w.lines, [&](float* lines) {
                kernels::transformLines(table, lines, w.work);
                if (!alone) kernels::splitPairs(lines, width, table->positions());
            });
            kernels::pairsToSpectra(w.lines, table->positions(), width, dst);
        });
    }
}

/// From the order between rows and columns, in place.
void inverseRealRows(const FourierPlan& plan, const Images& images, const Work& w) {
    if (plan.halfRoots != 0 && images.channels == 4) return inversePixelRows(plan, images, w);
    const kernels::FourierTable* const table = plan.rows();
    const int32_t width = plan.size.width;
    if (plan.hasShortRows)
        forEachRows(plan, images, kColumns, [&](const LineRows&, const LineRows& dst) {
            kernels::shortSpectraToRows(plan.shortRows(), dst, plan.rowInverse, w.lines);
        });
    else if (plan.halfRoots != 0)
        forEachRows(plan, images, kColumns, [&](const LineRows&, const LineRows& dst) {
            const bool isWide = plan.hasWideHalves();
            if (isWide)
                kernels::rowsToLines(dst, width, plan.rowInverse, Parts::inOrder, w.lines);
            else
                kernels::rowsToHalves(dst, width, plan.rowInverse, plan.roots(), w.lines);
            forEachLines(plan, images, w.lines, [&](float* lines) {
                if (isWide) kernels::joinWideHalves(lines, width, plan.wideRoots());
                kernels::transformLines(table, lines, w.work);
            });
            kernels::linesToRows(w.lines, table->positions(), width, Parts::exchanged, dst);
        });
    else {
        const bool alone = areAlone(plan.size);
        forEachRows(plan, images, alone ? kColumns : 2 * kColumns, [&](const LineRows&, const LineRows& dst) {
            kernels::spectraToPairs(dst, width, plan.rowInverse, alone, w.lines);
            forEachLines(plan, images, w.lines, [&](float* lines) { kernels::transformLines(table, lines, w.work); });
            kernels::pairsToRows(w.lines, table->positions(), width, dst);
        });
    }
}

/// The first block of columns, in lines, with both real columns of a channel in a lane; the last one's frequencies go
/// to the saved columns.
void transformJoined(const FourierPlan& plan, const SpectrumColumns& columns, const Work& w) {
    const kernels::FourierTable* const table = plan.columns();
    kernels::transformLines(table, w.lines, w.work);
    kernels::linesToColumns(w.lines, table->positions(), Parts::inOrder, columns.packed(0));
    columns.forEachChannel([&](int c) {
        kernels::splitRealColumns(w.lines + c, table->positions(), columns.column(0, c), savedOf(plan, w, c));
    });
}

/// The same with each real column in a lane of its own, which spares it a rounding. No last column, or lanes free for
/// it.
void transformApart(const FourierPlan& plan, const SpectrumColumns& columns, const Work& w) {
    const kernels::FourierTable* const table = plan.columns();
    float* const free = w.lines + columns.freeLane();
    columns.forEachChannel([&](int c) {
        if (columns.hasLastColumn()) {
            kernels::copyImaginary(w.lines + c, savedColumn(plan, w, c));
            kernels::joinRealColumn(savedColumn(plan, w, c), 1, free + c);
        }
        kernels::joinRealColumn(columns.column(0, c), plan.columnForward, w.lines + c);
    });
    kernels::transformLines(table, w.lines, w.work);
    kernels::linesToColumns(w.lines, table->positions(), Parts::inOrder, columns.packed(0));
    columns.forEachChannel([&](int c) {
        kernels::packRealColumn(w.lines + c, table->positions(), columns.column(0, c));
        if (columns.hasLastColumn()) kernels::packRealColumn(free + c, table->positions(), savedColumn(plan, w, c));
    });
}

/// The way back of both: the real columns of a channel share a lane where none is free for the saved one.
void inverseFirstColumns(const FourierPlan& plan, const SpectrumColumns& from, const SpectrumColumns& to,
                         const Work& w) {
    const kernels::FourierTable* const table = plan.columns();
    const bool isSavedApart = from.hasLastColumn() && !from.areJoined();
    float* const free = w.lines + from.freeLane();
    from.forEachChannel([&](int c) {
        const float* const joined = from.areJoined() ? savedOf(plan, w, c) : nullptr;
        kernels::joinRealColumns(from.column(0, c), joined, plan.columnInverse, w.lines + c);
        if (isSavedApart) kernels::joinRealColumns(savedColumn(plan, w, c), nullptr, plan.columnInverse, free + c);
    });
    kernels::transformLines(table, w.lines, w.work);
    kernels::linesToColumns(w.lines, table->positions(), Parts::exchanged, to.between(0));
    if (from.areJoined()) return;
    to.forEachChannel([&](int c) {
        kernels::storeRealColumn(w.lines + c, table->positions(), to.column(0, c));
        if (isSavedApart) kernels::storeRealColumn(free + c, table->positions(), to.column(1, c));
    });
}

/// The saved columns of several channels become pixels one behind the other, and columns again. Lines are free.
void turnSaved(const FourierPlan& plan, const Images& images, const Work& w, Direction direction) {
    const ptrdiff_t channels = images.channels, height = plan.size.height;
    if (channels == 1) return;
    std::copy_n(w.saved, channels * height, w.lines);
    for (ptrdiff_t c = 0; c < channels; ++c)
        for (ptrdiff_t y = 0; y < height; ++y) {
            const ptrdiff_t inPixel = y * channels + c, inColumn = c * height + y;
            if (direction == Direction::forward)
                w.saved[inPixel] = w.lines[inColumn];
            else
                w.saved[inColumn] = w.lines[inPixel];
        }
}

}  // namespace

void forwardReal(const FourierPlan& plan, const Images& images, uint8_t* buffer) {
    const Work w(plan, buffer);
    forwardRealRows(plan, images, w);
    const SpectrumColumns columns(plan, images.dst, images.dstStep, images);
    if (plan.shortColumnTable != 0)
        return columns.forEachChannel([&](int c) {
            kernels::shortColumnsToSpectra(plan.shortColumns(), columns.onlyColumns(c), plan.columnForward, w.lines);
        });
    const kernels::FourierTable* const table = plan.columns();
    kernels::columnsToLines(columns.between(0), plan.columnForward, Parts::inOrder, w.lines);
    if (columns.areJoined())
        transformJoined(plan, columns, w);
    else
        transformApart(plan, columns, w);
    const auto storeSaved = [&](int32_t x) {
        if (columns.hasLastColumn())
            columns.forEachChannel([&](int c) { kernels::floatsToColumn(savedOf(plan, w, c), columns.column(x, c)); });
    };
    // From the right, where whole blocks write what they have read and pass a pixel on, the last one at first; the
    // first block takes what is left.
    const int32_t blocks = columns.blocks();
    if (columns.hasLastColumn() && kernels::areColumnsShiftable(table, columns.between(blocks - 1))) {
        turnSaved(plan, images, w, Direction::forward);
        for (int32_t b = blocks - 1; b > 0; --b)
            kernels::transformColumnsShifted(table, towards(Towards::left, columns.between(b)), plan.columnForward,
                                             w.saved, w.lines);
        turnSaved(plan, images, w, Direction::inverse);
        return storeSaved(std::min(plan.size.width, 2 * kColumns / images.channels) - 1);
    }
    // Else from the left: packed pairs begin a pixel before those between, which have been read by then. The last
    // column waits until the last block has been read.
    for (int32_t b = 1; b < blocks; ++b)
        kernels::transformColumns(table, towards(Towards::right, columns.between(b)), columns.packed(b),
                                  plan.columnForward, Parts::inOrder, w.lines, w.work);
    storeSaved(plan.size.width - 1);
}

void inverseReal(const FourierPlan& plan, const Images& images, uint8_t* buffer) {
    const Work w(plan, buffer);
    const SpectrumColumns from(plan, images.src, images.srcStep, images);
    const SpectrumColumns to(plan, images.dst, images.dstStep, images);
    if (plan.shortColumnTable != 0) {
        from.forEachChannel([&](int c) {
            kernels::shortSpectraToColumns(plan.shortColumns(), from.onlyColumns(c), plan.columnInverse, w.lines,
                                           to.onlyColumns(c));
        });
        return inverseRealRows(plan, images, w);
    }
    const kernels::FourierTable* const table = plan.columns();
    // From the right, and the last column before all: what is written is where the source's pairs have been read.
    const auto last = [&](int c) { return from.hasLastColumn() ? savedOf(plan, w, c) : nullptr; };
    if (from.hasLastColumn())
        from.forEachChannel([&](int c) { kernels::columnToFloats(from.column(plan.size.width - 1, c), last(c)); });
    for (int32_t b = from.blocks() - 1; b > 0; --b)
        kernels::transformColumns(table, towards(Towards::left, from.packed(b)), to.between(b), plan.columnInverse,
                                  Parts::exchanged, w.lines, w.work);
    kernels::columnsToLines(from.packed(0), plan.columnInverse, Parts::exchanged, w.lines);
    inverseFirstColumns(plan, from, to, w);
    inverseRealRows(plan, images, w);
}

void transformComplex(const FourierPlan& plan, const Images& images, uint8_t* buffer, Direction direction) {
    const Work w(plan, buffer);
    const bool isForward = direction == Direction::forward;
    const Parts parts = isForward ? Parts::inOrder : Parts::exchanged;
    const kernels::FourierTable* const ofRows = plan.rows();
    const ptrdiff_t elements = ptrdiff_t{plan.size.width} * 2;
    forEachRows(plan, images, kColumns, [&](const LineRows& src, const LineRows& dst) {
        kernels::rowsToLines(src, elements, isForward ? plan.rowForward : plan.rowInverse, parts, w.lines);
        kernels::transformLines(ofRows, w.lines, w.work);
        kernels::linesToRows(w.lines, ofRows->positions(), elements, parts, dst);
    });
    const kernels::FourierTable* const ofColumns = plan.columns();
    const float scale = isForward ? plan.columnForward : plan.columnInverse;
    for (int32_t x = 0; x < plan.size.width; x += kColumns) {
        const LineColumns columns{rowsOf(images.dst, images.dstStep, images, 0, plan.size.height), ptrdiff_t{x} * 2, 0,
                                  std::min(kColumns, plan.size.width - x)};
        kernels::transformColumns(ofColumns, towards(Towards::right, columns), columns, scale, parts, w.lines, w.work);
    }
}

}  // namespace qori::transform
