// SPDX-License-Identifier: Apache-2.0
// The source rows of a window on its way down a region, for operations that make a few rows at a time and may keep
// state (sums, extremes, histograms) from one to the next.
//
// Rows come from where they lie: the image, wherever it still holds them. Copied is only what does not exist there or
// not any more:
//
//     gathered parts   columns whose windows leave the region on a closed side, with all that they see, a ring of rows
//     interior         straight from the image; rows beyond a closed side are the nearest row or one of constants
//     saved rows       in place, rows that have been written over and that windows still see: a ring
//
// The operation is called for each part of a group of rows, the interior first, before the next group begins, so its
// state is per part.
//
//     RowWindow window(image, needs, memory);       // memory of RowWindow::bytes(), or null where that is 0
//     window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
//         ... part.row(y + bottom) enters, part.row(y - top - 1) leaves (needs.rowsLeft = 1) ...
//     });
#pragma once
#include <algorithm>

#include "border.h"

namespace qori {

/// Whether the destination is the source, and what the operation promises then.
enum class Place {
    apart,    ///< They share no memory.
    inOrder,  ///< Same image; of the rows that it makes, the operation reads whatever it wants before it writes there.
    anyOrder  ///< Same image; the rows being made are read from copies too.
};

struct WindowNeeds {
    Reach reach;
    int32_t rowsAtOnce = 1;  ///< Rows that the operation makes at a time, fewer at the end.
    int32_t rowsLeft = 0;    ///< Rows that it still sees above its windows: those leaving running sums.
    int32_t partPixels = 1;  ///< Least width of a gathered part that the operation likes.
    Place place = Place::apart;

    int32_t above() const { return reach.top + rowsLeft; }
};

/// Rows by their index, the last few of them.
struct RowRing {
    uint8_t* memory;
    int64_t rowBytes;
    int32_t rows;

    uint8_t* row(int32_t slot) const { return memory + static_cast<ptrdiff_t>(slot * rowBytes); }
    int64_t bytes() const { return rows * rowBytes; }
};

class RowWindow;

/// Columns of the region whose windows lie in memory in one piece.
class WindowPart {
public:
    int32_t x = 0, width = 0;  ///< In the region.
    int32_t index = 0;         ///< 0, 1, ... from call to call of the same group, for state that is kept per part.

    /// Where source row y has the first pixel that the part's windows see: that of column x - reach.left. For the group
    /// first ... last, rows first - reach.top - rowsLeft to last + reach.bottom exist, from -reach.top on.
    const uint8_t* row(int32_t y) const;
    template <class T>
    const T* row(int32_t y) const {
        return reinterpret_cast<const T*>(row(y));
    }

private:
    friend class RowWindow;
    const RowWindow* window_ = nullptr;
    bool gathered_ = false;
    RowRing ring_{};
};

class RowWindow {
public:
    static constexpr int kMostParts = 3;

    /// Without memory it only measures.
    RowWindow(const BorderedImage& image, const WindowNeeds& needs, uint8_t* memory);
    RowWindow(const RowWindow&) = delete;  // its parts point at it
    RowWindow& operator=(const RowWindow&) = delete;

    /// Bytes of memory that make the window possible, at any alignment. No rule needs more than one of constants with
    /// all sides closed.
    static int64_t bytes(const BorderedImage& image, const WindowNeeds& needs) {
        return RowWindow(image, needs, nullptr).bytes_;
    }

    /// For state that an operation keeps per part; its rows exist while groups are made.
    int32_t parts() const { return parts_; }
    const WindowPart& part(int32_t index) const { return part_[index]; }

    /// Calls make(const WindowPart&, y, rows) for each part of each group of rows, from the top.
    template <class Make>
    void forEach(Make make) {
        for (int32_t y = 0; y < image_.size.height;) {
            const int32_t rows = std::min(needs_.rowsAtOnce, image_.size.height - y);
            enter(y, rows);
            for (int32_t i = 0; i < parts_; ++i) make(static_cast<const WindowPart&>(part_[i]), y, rows);
            y += rows;
        }
    }

private:
    friend class WindowPart;

    RowRing take(uint8_t*& memory, int64_t pixels, int32_t rows);
    void addParts(uint8_t*& memory);
    void addPart(uint8_t*& memory, int32_t x, int32_t width, bool gathered);
    void enter(int32_t y, int32_t rows);
    void save(int32_t y);
    int32_t savedSlot(int32_t y) const;
    const uint8_t* interiorRow(int32_t x, int32_t y) const;

    BorderedImage image_;
    WindowNeeds needs_;
    int64_t bytes_ = 0;
    RowRing saved_{}, constant_{};
    int32_t overwrittenBelow_ = 0;  ///< Rows 0 to this one (excluded) are read from copies.
    int32_t entered_;               ///< The first row that gathered parts have not seen yet.
    WindowPart part_[kMostParts];
    int32_t parts_ = 0;
};

}  // namespace qori
