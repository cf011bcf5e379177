// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements of windows over a region, from top to bottom and row by row. Two ways, by the cover:
//
//     rectangles   Rows are joined with themselves until an element is the extreme of a rectangle's width; these rows
//                  enter a block of the rectangle's height, in which the extremes of its first rows are kept as they
//                  come and, once it is full, those of its last rows are made backwards: a window is the last rows of
//                  one block and the first of the next, whatever the height (van Herk 1992; Gil, Werman 1993).
//     taps         Levels of a row are the row joined with itself to 2, 4, 8 ... pixels; all taps of a pixel are
//     joined.
//
// In place and for floats, source rows are copied, the latter as keys; else they are read where they are.
#pragma once
#include "frame/plan.h"
#include "frame/row_window.h"
#include "kernels/copy_rows.h"
#include "kernels/morphology/joins.h"
#include "window_cover.h"

namespace qori::filter {

template <class T>
struct ExtremeTask {
    Image<const T> src;
    Image<T> dst;
    QorImageSize roi;
    int32_t channels;
    bool isInPlace;
    Window window;
    WindowCover cover;
    const kernels::Joins<T>* joins;
    kernels::JoinFinish finish;
    void (*toKeys)(const T* bits, T* keys, ptrdiff_t elements, ptrdiff_t ahead);  ///< Null unless floats are joined.

    ptrdiff_t elements(int64_t pixels) const { return static_cast<ptrdiff_t>(pixels * channels); }
    /// The task of some of its columns.
    ExtremeTask columns(int32_t x, int32_t width) const {
        ExtremeTask part = *this;
        part.src.data += elements(x);
        part.dst.data += elements(x);
        part.roi.width = width;
        return part;
    }
};

/// Rows of T, by their number in the ring.
template <class T>
struct ElementRows {
    RowRing ring{};

    void take(WorkBuffer& work, int64_t elements, int32_t rows) {
        constexpr int64_t kFewSets = 2048;  // rows so far apart share the same few sets of a cache
        int64_t rowBytes = roundUp(elements * elementBytes<T>, kVectorBytes);
        if (rowBytes % kFewSets == 0) rowBytes += kBlockAlignment;
        ring = {work.take<uint8_t>(rowBytes * rows), rowBytes, rows};
    }
    T* row(int32_t slot) const { return reinterpret_cast<T*>(ring.row(slot)); }
};

/// Source rows as joins want them, from the box's first column on. For a group of destination rows from y on, those of
/// y + lowest to y + group - 1 + highest are there.
template <class T>
class SourceRows {
public:
    SourceRows(const ExtremeTask<T>& task, int32_t lowest, int32_t group, bool isKept, WorkBuffer& work)
        : task_(task), entered_(task.cover.box.y), isKept_(isKept || task.toKeys != nullptr) {
        const int32_t highest = task.cover.lastRow();
        ahead_ = task.isInPlace && highest < 0 ? 0 : highest;
        elements_ = task.elements(int64_t{task.roi.width} + task.cover.box.width - 1);
        if (isKept_) rows_.take(work, elements_, ahead_ - lowest + group);
    }

    /// Before the destination's rows up to y are written: what they and later ones see is kept. Calls entered(row) for
    /// each row that comes.
    template <class Entered>
    void enter(int32_t y, Entered entered) {
        const int32_t lastSeen = task_.roi.height - 1 + task_.cover.lastRow();
        for (; entered_ <= y + ahead_ && entered_ <= lastSeen; ++entered_) {
            if (isKept_) copy(entered_);
            entered(entered_);
        }
    }
    const T* row(int32_t y) const {
        return isKept_ ? rows_.row((y - task_.cover.box.y) % rows_.ring.rows) : inImage(y);
    }

    /// A row that the destination has not come to. The image has it still, and unlike its copy no stores on their way
    /// to memory, which loads across two of them would wait for.
    const T* rowAhead(int32_t y) const { return task_.toKeys == nullptr ? inImage(y) : row(y); }

    /// Elements from a row in the image to one so many rows below; copies are in the cache anyway.
    ptrdiff_t ahead(int32_t rows) const { return isKept_ ? 0 : stepOf(rows); }

private:
    ptrdiff_t stepOf(int64_t rows) const { return static_cast<ptrdiff_t>(rows * task_.src.step / elementBytes<T>); }
    const T* inImage(int32_t y) const { return task_.src.row(y) + ptrdiff_t{task_.cover.box.x} * task_.channels; }
    void copy(int32_t y) {
        const T* const from = inImage(y);
        T* const to = rows_.row((y - task_.cover.box.y) % rows_.ring.rows);
        if constexpr (std::is_same_v<T, kernels::FloatKey>)
            if (task_.toKeys != nullptr) return task_.toKeys(from, to, elements_, stepOf(1));
        kernels::copyRow(asBytes(to), asBytes(from), elements_ * elementBytes<T>);
    }

    const ExtremeTask<T>& task_;
    ElementRows<T> rows_;
    int32_t entered_, ahead_;
    ptrdiff_t elements_;
    bool isKept_;
};

// --- rectangles -----------------------------------------------------------------------------------------------------

/// Destination rows made at a time: what joins hold in registers from row to row is loaded and stored once for all.
inline constexpr int32_t kGroup = kernels::kMostEntering;

/// The extremes of a rectangle, some rows at a time.
template <class T>
class RunningRect {
public:
    void take(const QorImageRect& rect, ptrdiff_t elements, WorkBuffer& work) {
        rect_ = rect;
        elements_ = elements;
        block_.take(work, elements, rect.height);
        soFar_.take(work, elements, 1);
    }
    const QorImageRect& rect() const { return rect_; }
    /// The source row that completes the rectangles of destination row y.
    int32_t rowFor(int32_t y) const { return y + rect_.y + rect_.height - 1; }
    /// Rows that enter together, of so many: those up to the end of a block.
    int32_t together(int32_t rows) const { return std::min(rows, rect_.height - phase_); }

    /// Rows enter, each the join of its taps, and are joined with what is elsewhere.
    void enter(const kernels::Joins<T>& joins, int32_t rows, const T* const* taps, int tapsEach,
               const T* const* elsewhere, T* const* to, kernels::JoinFinish finish) {
        kernels::EnteringRow<T> row[kGroup];
        for (int32_t k = 0; k < rows; ++k) {
            T* const entering = block_.row(phase_ + k);
            row[k] = {entering, phase_ + k + 1 < rect_.height ? block_.row(phase_ + k + 1) : nullptr,
                      elsewhere == nullptr ? nullptr : elsewhere[k], to[k]};
        }
        const T* const before = phase_ == 0 ? nullptr : soFar_.row(0);
        joins.enter({taps, tapsEach, row, rows, before, soFar_.row(0), elements_, finish});
        phase_ += rows;
        if (phase_ == rect_.height) endBlock(joins);
    }

private:
    void endBlock(const kernels::Joins<T>& joins) {
        phase_ = 0;
        if (rect_.height <= 2) return;
        const auto step = static_cast<ptrdiff_t>(block_.ring.rowBytes) / elementBytes<T>;
        joins.joinUpwards(block_.row(rect_.height - 1), step, rect_.height - 1, elements_);
    }

    QorImageRect rect_{};
    ptrdiff_t elements_ = 0;
    ElementRows<T> block_, soFar_;
    int32_t phase_ = 0;
};

template <class T>
class RectRun {
public:
    RectRun(const ExtremeTask<T>& task, WorkBuffer& work)
        : task_(task), source_(task, lowestRow(task.cover), kGroup, isKept(task), work) {
        const ptrdiff_t elements = task.elements(task.roi.width);
        int32_t widest = 1;
        for (int k = 0; k < task.cover.rects; ++k) {
            running_[k].take(task.cover.rect[k], elements, work);
            widening_[k] = Widening::to(task.cover.rect[k].width, task.channels * elementBytes<T>);
            widest = std::max(widest, task.cover.rect[k].width);
        }
        for (ElementRows<T>& rows : wider_)
            rows.take(work, task.elements(int64_t{task.roi.width} + widest - 1), kGroup);
        joined_.take(work, elements, kGroup);
    }

    void run() {
        int32_t tallest = 1;
        for (int k = 0; k < task_.cover.rects; ++k) tallest = std::max(tallest, task_.cover.rect[k].height);
        for (int32_t y = 1 - tallest; y < task_.roi.height; y += kGroup) {
            const int32_t end = std::min(y + kGroup, task_.roi.height);
            source_.enter(end - 1, [](int32_t) {});
            for (int k = 0; k < task_.cover.rects; ++k) {
                const int32_t first = std::max(y, 1 - task_.cover.rect[k].height);
                if (first < end) makeRows(k, first, first - y, end - first);
            }
        }
    }

private:
    static int32_t lowestRow(const WindowCover& cover) {
        int32_t lowest = INT32_MAX;
        for (int k = 0; k < cover.rects; ++k) lowest = std::min(lowest, cover.rect[k].y + cover.rect[k].height - 1);
        return lowest;
    }
    /// In place, rows need no copy where all rectangles end in the same row, below the group that is written.
    static bool isKept(const ExtremeTask<T>& task) {
        return task.isInPlace && (task.cover.lastRow() < kGroup || lowestRow(task.cover) < task.cover.lastRow());
    }

    /// Rows of a rectangle, the first of them row `at` of the group, joined with those of the rectangles before it; of
    /// the last one they are the destination's. Nobody wants what comes before its first row.
    void makeRows(int k, int32_t y, int32_t at, int32_t rows) {
        const T* taps[kGroup * Widening::kMostRadix];
        const T* elsewhere[kGroup];
        T* to[kGroup];
        const bool isLast = k + 1 == task_.cover.rects;
        for (int32_t i = 0; i < rows; ++i) {
            elsewhere[i] = joined_.row(at + i);
            to[i] = isLast && y + i >= 0 ? task_.dst.row(y + i) : joined_.row(at + i);
        }
        const int count = widen(k, y, rows, taps);
        const kernels::JoinFinish finish = isLast ? task_.finish : kernels::JoinFinish{};
        for (int32_t i = 0; i < rows;) {
            const int32_t together = running_[k].together(rows - i);
            running_[k].enter(*task_.joins, together, taps + i * count, count, k > 0 ? elsewhere + i : nullptr, to + i,
                              finish);
            i += together;
        }
    }

    /// Joins rows with themselves, but for the last pass, whose taps it sets; returns their number for each row. All
    /// rows make a pass before any makes the next: loads across recent stores wait for these.
    int widen(int k, int32_t y, int32_t rows, const T** taps) {
        const QorImageRect& rect = task_.cover.rect[k];
        const Widening& widening = widening_[k];
        const T* row[kGroup];
        for (int32_t i = 0; i < rows; ++i)
            row[i] = source_.row(running_[k].rowFor(y + i)) + task_.elements(rect.x - task_.cover.box.x);
        int32_t has = 1;
        int pass = 0;
        const auto seen = [&] { return task_.elements(int64_t{task_.roi.width} + rect.width - has); };
        if (widening.rounds > 0) {
            T* to[kGroup];
            for (int32_t i = 0; i < rows; ++i) to[i] = wider_[0].row(i);
            task_.joins->widen({row, rows, to, seen(), task_.channels, widening.rounds, source_.ahead(2)});
            for (int32_t i = 0; i < rows; ++i) row[i] = to[i];
            has = 1 << widening.rounds;
            ++pass;
        }
        for (;; ++pass) {
            const auto next = static_cast<int32_t>(std::min<int64_t>(int64_t{has} * widening.radix, rect.width));
            const int count = (next - 1) / has + 1;
            ptrdiff_t tap[Widening::kMostRadix];
            for (int t = 0; t < count; ++t) tap[t] = task_.elements(std::min(t * has, next - has));
            for (int32_t i = 0; i < rows; ++i)
                for (int t = 0; t < count; ++t) taps[i * count + t] = row[i] + tap[t];
            has = next;
            if (next == rect.width) return count;
            for (int32_t i = 0; i < rows; ++i) {
                T* const out = wider_[pass % 2].row(i);
                task_.joins->join(taps + i * count, count, out, seen());
                row[i] = out;
            }
        }
    }

    const ExtremeTask<T>& task_;
    SourceRows<T> source_;
    RunningRect<T> running_[WindowCover::kMostRects];
    Widening widening_[WindowCover::kMostRects]{};
    ElementRows<T> wider_[2];
    ElementRows<T> joined_;
};

// --- taps -----------------------------------------------------------------------------------------------------------

template <class T>
class TapRun {
public:
    TapRun(const ExtremeTask<T>& task, WorkBuffer& work)
        : task_(task), source_(task, task.cover.box.y, 1, task.isInPlace, work) {
        taps_ = work.take<Tap>(task.cover.taps);
        rows_ = work.take<const T*>(task.cover.taps);
        const int32_t ahead = task.isInPlace ? std::max(task.cover.lastRow(), 0) : task.cover.lastRow();
        for (int32_t level = 1; level <= task.cover.levels; ++level)
            level_[level].take(work, task.elements(widthOf(level)), ahead - task.cover.box.y + 1);
    }

    void run() {
        Tap* next = taps_;
        forEachTap(task_.window, task_.cover.levels > 0, [&](Tap tap) { *next++ = tap; });
        for (int32_t y = 0; y < task_.roi.height; ++y) {
            source_.enter(y, [this](int32_t row) { raise(row); });
            const T* row = nullptr;
            for (int64_t k = 0; k < task_.cover.taps; ++k) {
                const Tap tap = taps_[k];
                // Taps come row by row, and where a row lies takes a division.
                if (k == 0 || tap.y != taps_[k - 1].y || tap.level != taps_[k - 1].level) row = rowOf(tap, y);
                rows_[k] = row + task_.elements(tap.x - task_.cover.box.x);
            }
            task_.joins->joinInto(rows_, static_cast<int>(task_.cover.taps), task_.dst.row(y),
                                  task_.elements(task_.roi.width), task_.finish);
        }
    }

private:
    static constexpr int kMostLevels = 31;

    int64_t widthOf(int32_t level) const {
        return int64_t{task_.roi.width} + task_.cover.box.width - (int64_t{1} << level);
    }
    T* levelRow(int32_t level, int32_t y) const {
        return level_[level].row((y - task_.cover.box.y) % level_[level].ring.rows);
    }
    /// A tap's row, for destination row y.
    const T* rowOf(Tap tap, int32_t y) const {
        if (tap.level > 0) return levelRow(tap.level, y + tap.y);
        return tap.y > 0 ? source_.rowAhead(y + tap.y) : source_.row(y + tap.y);
    }
    /// Makes the levels of a source row.
    void raise(int32_t y) {
        for (int32_t level = 1; level <= task_.cover.levels; ++level) {
            const T* const lower = level > 1 ? levelRow(level - 1, y) : source_.rowAhead(y);
            const T* const both[] = {lower, lower + task_.elements(int64_t{1} << (level - 1))};
            task_.joins->join(both, 2, levelRow(level, y), task_.elements(widthOf(level)));
        }
    }

    const ExtremeTask<T>& task_;
    SourceRows<T> source_;
    ElementRows<T> level_[kMostLevels];
    Tap* taps_;
    const T** rows_;
};

}  // namespace qori::filter
