// SPDX-License-Identifier: Apache-2.0
#include "row_window.h"

#include "kernels/copy_rows.h"

namespace qori {

/// The rows saved are those that later groups see. Where these are fewer than a group has, two sets alternate; else
/// those above a group and its own are kept at once.
RowWindow::RowWindow(const BorderedImage& image, const WindowNeeds& needs, uint8_t* memory)
    : image_(image), needs_(needs), entered_(-needs.reach.top) {
    const bool sets = needs.place == Place::inOrder && needs.above() <= needs.rowsAtOnce;
    const int32_t saved = needs.place == Place::apart ? 0 : sets ? 2 * needs.above() : needs.above() + needs.rowsAtOnce;
    const int64_t seen = int64_t{image.size.width} + needs.reach.columns();
    saved_ = take(memory, seen, saved);
    const bool closed = !image.rule.open.top || !image.rule.open.bottom;
    constant_ = take(memory, seen, image.rule.constant != nullptr && closed ? 1 : 0);
    addParts(memory);
    if (constant_.memory == nullptr || constant_.rows == 0) return;
    BorderedImage outside = image;  // a row above it, with that side closed, is all constants
    outside.rule.open.top = false;
    outside.gather({0, -1, image.size.width + needs.reach.columns(), 1}, constant_.memory, 0);
}

RowRing RowWindow::take(uint8_t*& memory, int64_t pixels, int32_t rows) {
    const RowRing ring{memory, pixels * image_.pixelBytes, rows};
    bytes_ += ring.bytes();
    if (memory != nullptr) memory += static_cast<ptrdiff_t>(ring.bytes());
    return ring;
}

/// The interior comes first: it sees columns of the others, which see nothing but what has been gathered.
void RowWindow::addParts(uint8_t*& memory) {
    const int32_t width = image_.size.width;
    const auto strip = [this](bool open, int32_t reach) {
        return open || reach == 0 ? 0 : std::max(reach, needs_.partPixels);
    };
    const int32_t left = strip(image_.rule.open.left, needs_.reach.left);
    const int32_t right = strip(image_.rule.open.right, needs_.reach.right);
    if (int64_t{left} + right >= width && left + int64_t{right} > 0) return addPart(memory, 0, width, true);
    addPart(memory, left, width - left - right, false);
    if (left > 0) addPart(memory, 0, left, true);
    if (right > 0) addPart(memory, width - right, right, true);
}

void RowWindow::addPart(uint8_t*& memory, int32_t x, int32_t width, bool gathered) {
    WindowPart& part = part_[parts_];
    part.x = x;
    part.width = width;
    part.index = parts_++;
    part.window_ = this;
    part.gathered_ = gathered;
    part.ring_ = {};
    if (gathered)
        part.ring_ = take(memory, int64_t{width} + needs_.reach.columns(),
                          needs_.above() + needs_.reach.bottom + needs_.rowsAtOnce);
}

/// A group begins: what it will overwrite is still there.
void RowWindow::enter(int32_t y, int32_t rows) {
    const int32_t end = y + rows + needs_.reach.bottom;
    for (; entered_ < end; ++entered_)
        for (int32_t i = 0; i < parts_; ++i) {
            const WindowPart& part = part_[i];
            if (!part.gathered_) continue;
            image_.gather({part.x - needs_.reach.left, entered_, part.width + needs_.reach.columns(), 1},
                          part.ring_.row((entered_ + needs_.above()) % part.ring_.rows), 0);
        }
    if (needs_.place == Place::apart) return;
    const bool all = needs_.place == Place::anyOrder, isLast = y + rows == image_.size.height;
    const int32_t first = all ? y : isLast ? y + rows : std::max(y, y + rows - needs_.above());
    for (int32_t row = first; row < y + rows; ++row) save(row);
    overwrittenBelow_ = all ? y + rows : y;
}

int32_t RowWindow::savedSlot(int32_t y) const {
    const int32_t group = needs_.rowsAtOnce, kept = needs_.above();
    if (saved_.rows != 2 * kept) return y % saved_.rows;
    return y / group % 2 * kept + y % group - (group - kept);
}

/// With the neighbours on open sides, in the place that the row's first seen column has in its slot.
void RowWindow::save(int32_t y) {
    const int32_t left = image_.rule.open.left ? needs_.reach.left : 0;
    const int32_t right = image_.rule.open.right ? needs_.reach.right : 0;
    const ptrdiff_t skipped = ptrdiff_t{needs_.reach.left - left} * image_.pixelBytes;
    const ptrdiff_t bytes = (ptrdiff_t{image_.size.width} + left + right) * image_.pixelBytes;
    kernels::copyRow(saved_.row(savedSlot(y)) + skipped, image_.pixel(-left, y), bytes);
}

const uint8_t* RowWindow::interiorRow(int32_t x, int32_t y) const {
    if (image_.rule.constant != nullptr && image_.isMissingRow(y)) return constant_.memory;
    const int32_t row = image_.seenRow(y);
    if (row < 0 || row >= overwrittenBelow_) return image_.pixel(x - needs_.reach.left, row);
    return saved_.row(savedSlot(row)) + ptrdiff_t{x} * image_.pixelBytes;
}

const uint8_t* WindowPart::row(int32_t y) const {
    if (!gathered_) return window_->interiorRow(x, y);
    return ring_.row((y + window_->needs_.above()) % ring_.rows);
}

}  // namespace qori
