// SPDX-License-Identifier: Apache-2.0
// Rows and columns in turn, rows first on the way forward and last on the way back. Between them the destination holds
// rows of spectra in an order of their own: of an even width frequency 0, frequency W / 2, then the parts of 1, 2, ...,
// so that the two real columns are one complex column and all pairs are aligned; of an odd width the packed order.
#include "fourier_run.h"

#include <algorithm>

#include "kernels/transform/move_lines.h"

namespace qori::transform {
namespace {

using kernels::LineColumns;
using kernels::LineRows;
using kernels::Parts;

constexpr int kColumns = kernels::kLineColumns;

/// The buffer's pieces.
struct Work {
    float *lines, *work, *saved;

    Work(const FourierPlan& plan, uint8_t* buffer)
        : lines(reinterpret_cast<float*>(buffer)),
          work(tableOf<float>(buffer, plan.workAt)),
          saved(tableOf<float>(buffer, plan.savedAt)) {}
};

LineRows rowsOf(const float* image, int32_t step, int channels, int32_t y, int count) {
    // Kernels that read take the same description as those that write.
    return {asBytes(const_cast<float*>(image)) + ptrdiff_t{y} * step, step, count, channels};
}

/// Calls each(source rows, destination rows) for so many rows at a time.
template <class Each>
void forEachRows(const FourierPlan& plan, const Channel& c, int most, Each each) {
    for (int32_t y = 0; y < plan.size.height; y += most) {
        const int count = std::min(most, plan.size.height - y);
        each(rowsOf(c.src, c.srcStep, c.channels, y, count), rowsOf(c.dst, c.dstStep, c.channels, y, count));
    }
}

/// Complex columns of a real image's spectra, the real ones being one of them.
class SpectrumColumns {
public:
    SpectrumColumns(const FourierPlan& plan, const float* image, int32_t step, int channels)
        : width_(plan.size.width), rows_(rowsOf(image, step, channels, 0, plan.size.height)) {}

    int32_t blocks() const { return (width_ / 2 + width_ % 2 + kColumns - 1) / kColumns; }
    /// Lanes of block b. In the packed order the first lane of block 0 is no pair.
    LineColumns packed(int32_t b) const { return {rows_, ptrdiff_t{b} * 2 * kColumns - 1, b == 0 ? 1 : 0, end(b)}; }
    LineColumns between(int32_t b) const {
        if (width_ % 2 == 1) return packed(b);
        return {rows_, ptrdiff_t{b} * 2 * kColumns, 0, end(b)};
    }
    bool hasLastColumn() const { return width_ % 2 == 0; }
    LineRows column(int32_t x) const {
        LineRows rows = rows_;
        rows.first = asBytes(rows.row(0) + ptrdiff_t{x} * rows.channels);
        return rows;
    }

private:
    int end(int32_t b) const { return std::min(kColumns, width_ / 2 + width_ % 2 - b * kColumns); }

    int32_t width_;
    LineRows rows_;
};

void forwardRealRows(const FourierPlan& plan, const Channel& c, const Work& w) {
    const kernels::FourierTable* const table = plan.rows();
    const int32_t width = plan.size.width;
    if (plan.halfRoots != 0)
        forEachRows(plan, c, kColumns, [&](const LineRows& src, const LineRows& dst) {
            kernels::rowsToLines(src, width, plan.rowForward, Parts::inOrder, w.lines);
            kernels::transformLines(table, w.lines, w.work);
            kernels::halvesToRows(w.lines, width, table->positions(), plan.roots(), dst);
        });
    else
        forEachRows(plan, c, 2 * kColumns, [&](const LineRows& src, const LineRows& dst) {
            kernels::rowsToPairs(src, width, plan.rowForward, w.lines);
            kernels::transformLines(table, w.lines, w.work);
            kernels::splitPairs(w.lines, width, table->positions());
            kernels::pairsToSpectra(w.lines, table->positions(), width, dst);
        });
}

/// From the order between rows and columns, in place.
void inverseRealRows(const FourierPlan& plan, const Channel& c, const Work& w) {
    const kernels::FourierTable* const table = plan.rows();
    const int32_t width = plan.size.width;
    if (plan.halfRoots != 0)
        forEachRows(plan, c, kColumns, [&](const LineRows&, const LineRows& dst) {
            kernels::rowsToHalves(dst, width, plan.rowInverse, plan.roots(), w.lines);
            kernels::transformLines(table, w.lines, w.work);
            kernels::linesToRows(w.lines, table->positions(), width, Parts::exchanged, dst);
        });
    else
        forEachRows(plan, c, 2 * kColumns, [&](const LineRows&, const LineRows& dst) {
            kernels::spectraToPairs(dst, width, plan.rowInverse, w.lines);
            kernels::joinPairs(w.lines, width);
            kernels::transformLines(table, w.lines, w.work);
            kernels::pairsToRows(w.lines, table->positions(), width, dst);
        });
}

}  // namespace

void forwardReal(const FourierPlan& plan, const Channel& c, uint8_t* buffer) {
    const Work w(plan, buffer);
    forwardRealRows(plan, c, w);
    const SpectrumColumns columns(plan, c.dst, c.dstStep, c.channels);
    const kernels::FourierTable* const table = plan.columns();
    kernels::columnsToLines(columns.between(0), plan.columnForward, Parts::inOrder, w.lines);
    if (!columns.hasLastColumn()) kernels::joinRealColumn(columns.column(0), plan.columnForward, w.lines);
    kernels::transformLines(table, w.lines, w.work);
    kernels::linesToColumns(w.lines, table->positions(), Parts::inOrder, columns.packed(0));
    kernels::splitRealColumns(w.lines, table->positions(), columns.column(0),
                              columns.hasLastColumn() ? w.saved : nullptr);
    // From the right, where whole blocks write what they have read and pass a column on, the last one at first; the
    // first block takes what is left.
    int32_t b = columns.blocks() - 1;
    const auto isShifted = [&] {
        return columns.hasLastColumn() &&
               kernels::transformColumnsShifted(table, columns.between(b), plan.columnForward, w.saved, w.lines);
    };
    while (b > 0 && isShifted()) --b;
    if (b == 0) {
        if (columns.hasLastColumn())
            kernels::floatsToColumn(w.saved, columns.column(std::min(plan.size.width, 2 * kColumns) - 1));
        return;
    }
    // Else from the left: packed pairs begin an element before those between, which have been read by then. The last
    // column waits until the last block has been read.
    for (b = 1; b < columns.blocks(); ++b)
        kernels::transformColumns(table, columns.between(b), columns.packed(b), plan.columnForward, Parts::inOrder,
                                  w.lines, w.work);
    if (columns.hasLastColumn()) kernels::floatsToColumn(w.saved, columns.column(plan.size.width - 1));
}

void inverseReal(const FourierPlan& plan, const Channel& c, uint8_t* buffer) {
    const Work w(plan, buffer);
    const SpectrumColumns from(plan, c.src, c.srcStep, c.channels), to(plan, c.dst, c.dstStep, c.channels);
    const kernels::FourierTable* const table = plan.columns();
    // From the right, and the last column before all: what is written is where the source's pairs have been read.
    const float* const saved = from.hasLastColumn() ? w.saved : nullptr;
    if (from.hasLastColumn()) kernels::columnToFloats(from.column(plan.size.width - 1), w.saved);
    for (int32_t b = from.blocks() - 1; b > 0; --b)
        kernels::transformColumns(table, from.packed(b), to.between(b), plan.columnInverse, Parts::exchanged, w.lines,
                                  w.work);
    kernels::columnsToLines(from.packed(0), plan.columnInverse, Parts::exchanged, w.lines);
    kernels::joinRealColumns(from.column(0), saved, plan.columnInverse, w.lines);
    kernels::transformLines(table, w.lines, w.work);
    kernels::linesToColumns(w.lines, table->positions(), Parts::exchanged, to.between(0));
    if (!to.hasLastColumn()) kernels::storeRealColumn(w.lines, table->positions(), to.column(0));
    inverseRealRows(plan, c, w);
}

void transformComplex(const FourierPlan& plan, const Channel& c, uint8_t* buffer, Direction direction) {
    const Work w(plan, buffer);
    const bool isForward = direction == Direction::forward;
    const Parts parts = isForward ? Parts::inOrder : Parts::exchanged;
    const kernels::FourierTable* const ofRows = plan.rows();
    const ptrdiff_t elements = ptrdiff_t{plan.size.width} * 2;
    forEachRows(plan, c, kColumns, [&](const LineRows& src, const LineRows& dst) {
        kernels::rowsToLines(src, elements, isForward ? plan.rowForward : plan.rowInverse, parts, w.lines);
        kernels::transformLines(ofRows, w.lines, w.work);
        kernels::linesToRows(w.lines, ofRows->positions(), elements, parts, dst);
    });
    const kernels::FourierTable* const ofColumns = plan.columns();
    const float scale = isForward ? plan.columnForward : plan.columnInverse;
    for (int32_t x = 0; x < plan.size.width; x += kColumns) {
        const LineColumns columns{rowsOf(c.dst, c.dstStep, 1, 0, plan.size.height), ptrdiff_t{x} * 2, 0,
                                  std::min(kColumns, plan.size.width - x)};
        kernels::transformColumns(ofColumns, columns, columns, scale, parts, w.lines, w.work);
    }
}

}  // namespace qori::transform
