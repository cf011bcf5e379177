// SPDX-License-Identifier: Apache-2.0
// What a neighbourhood operation sees beyond its region, for every operation that looks around a pixel.
//
// Each axis has its own rule: beyond an open side pixels are read from memory, beyond a closed one they are
// synthesised, from the nearest pixel along that axis, from the mirrored one or as a constant. With the constant a
// pixel is missing when either of its coordinates is.
//
// Synthesised pixels exist in the caller's work buffer only, and only where a window needs them. With a window that
// reaches l, t, r, b pixels to the left, above, to the right and below, and with all sides closed:
//
//     +-------------------------------+
//     |         band of t rows        |   bands     rows whose windows leave the region above or below, gathered
//     +---+-----------------------+---+             with everything that they see, corners included
//     | s |                       | s |   strips    columns of the other rows whose windows leave it to a side,
//     | t |       interior        | t |             gathered likewise, some rows at a time
//     | r |                       | r |   interior  straight from the source
//     +---+-----------------------+---+
//     |         band of b rows        |   Nothing outside the region is read beyond a closed side.
//     +-------------------------------+
#pragma once
#include "image/image.h"

namespace qori {

/// How far a window reaches beyond its pixel.
struct Reach {
    int32_t left, top, right, bottom;

    /// That of a width x height kernel; an even one reaches further to the left and above.
    static Reach ofKernel(QorImageSize kernel) {
        const int32_t left = kernel.width / 2, top = kernel.height / 2;
        return {left, top, kernel.width - 1 - left, kernel.height - 1 - top};
    }
    int32_t columns() const { return left + right; }
    int32_t rows() const { return top + bottom; }
};

/// Sides of an image, each beyond which pixels are read from memory (open) or not.
struct Sides {
    bool left, top, right, bottom;

    constexpr bool all() const { return left && top && right && bottom; }
};

/// How pixels beyond a closed side come about.
enum class BorderKind {
    constant,
    replicate,
    mirror,   ///< The pixel as far on the other side of the edge pixel, which is not repeated itself.
    readAll,  ///< They do not: all sides are open.
    unknown   ///< Not named; a family refuses it, or says what it does instead.
};

/// A QorBorderMode taken apart, which happens here only. Each family states the kinds that it takes and its status for
/// others.
struct Border {
    BorderKind kind;  ///< As given, also where no side is closed.
    Sides open;

    static constexpr Border of(int32_t mode);
    constexpr bool isOneOf(auto... kinds) const { return ((kind == kinds) || ...); }
};

constexpr Border Border::of(int32_t mode) {
    constexpr int32_t kKindMask = 15, kMirror = 3, kSides = 0xF0;
    const int32_t kind = mode & kKindMask;
    const bool all = kind == borderReadAll || (mode & kSides) == kSides;
    const auto open = [=](int32_t flag) { return all || (mode & flag) != 0; };
    return {kind == borderConstant    ? BorderKind::constant
            : kind == borderReplicate ? BorderKind::replicate
            : kind == kMirror         ? BorderKind::mirror
            : kind == borderReadAll   ? BorderKind::readAll
                                      : BorderKind::unknown,
            {open(borderReadLeft), open(borderReadTop), open(borderReadRight), open(borderReadBottom)}};
}

/// What windows see beyond each side, by this model: from memory, one constant, the nearest pixel or the mirrored one.
struct BorderRule {
    Sides open;
    const uint8_t* constant;  ///< The missing pixel, or null where pixels are replicated or mirrored.
    /// For windows that reach as far on both sides of an axis. Not in place: mirrored rows may have been written over.
    bool mirrors = false;

    static constexpr BorderRule readAll() { return {{true, true, true, true}, nullptr}; }
    /// Of a family that takes no kinds but these; any other would replicate.
    static BorderRule of(Border border, const void* value) {
        return {border.open, border.kind == BorderKind::constant ? static_cast<const uint8_t*>(value) : nullptr};
    }
    /// Of a family that mirrors too.
    static BorderRule withMirror(Border border, const void* value) {
        BorderRule rule = of(border, value);
        rule.mirrors = border.kind == BorderKind::mirror;
        return rule;
    }
};

/// A region and its surroundings by a rule.
struct BorderedImage {
    const uint8_t* origin;  ///< Pixel (0, 0).
    ptrdiff_t step;
    QorImageSize size;
    int32_t pixelBytes;
    BorderRule rule;

    const uint8_t* pixel(int32_t x, int32_t y) const { return origin + y * step + ptrdiff_t{x} * pixelBytes; }
    /// The coordinates whose pixel is seen there, where it is not the constant. Mirrored ones are never further away.
    int32_t seenColumn(int32_t x) const { return seen(x, size.width, rule.open.left, rule.open.right); }
    int32_t seenRow(int32_t y) const { return seen(y, size.height, rule.open.top, rule.open.bottom); }
    bool isMissingRow(int32_t y) const { return (y < 0 && !rule.open.top) || (y >= size.height && !rule.open.bottom); }
    /// Writes the pixels of a rectangle, which may lie anywhere around the region.
    void gather(QorImageRect rect, uint8_t* to, ptrdiff_t toStep) const;

private:
    int32_t seen(int32_t at, int32_t count, bool openBefore, bool openBehind) const;
};

/// Pixels to be made and where their windows lie.
struct BorderPart {
    QorImageRect area;      ///< In the region.
    const uint8_t* window;  ///< First pixel of the window of the area's first pixel.
    ptrdiff_t step;
    ptrdiff_t slackBytes;  ///< May be read behind the last window of each row.
};

/// What an operation's kernel likes: strips of at least blockPixels, an interior of whole blocks, slackBytes that it
/// may read behind a row's last window.
struct PartHints {
    int32_t blockPixels;
    int32_t slackBytes;
};

/// Bytes of buffer that make the parts of a region possible, whatever the rule: bands of 2 * rows() rows each, or
/// strips for each row of the region.
int64_t borderBytes(QorImageSize region, Reach reach, int32_t pixelBytes);

/// The parts of a region one after the other; one buffer of borderBytes() serves them all in turn.
class BorderParts {
public:
    BorderParts(const BorderedImage& image, Reach reach, PartHints hints, uint8_t* buffer);

    /// Calls visit(BorderPart) for each part.
    template <class Visit>
    void forEach(Visit visit) {
        for (int32_t i = 0; i < jobs_; ++i)
            for (int32_t y = 0; y < job_[i].area.height;) {
                const BorderPart part = make(job_[i], y);
                visit(part);
                y += part.area.height;
            }
    }

private:
    /// A band, a strip or the interior.
    struct Job {
        QorImageRect area;
        bool fromSource;
        ptrdiff_t slackBytes;
    };

    void addRows();
    void addColumns(int32_t y, int32_t height);
    void add(const Job& job) { job_[jobs_++] = job; }
    bool fits(int32_t width, ptrdiff_t slackBytes) const;
    ptrdiff_t rowBytes(int32_t width, ptrdiff_t slackBytes) const;
    BorderPart make(const Job& job, int32_t y);

    BorderedImage image_;
    Reach reach_;
    PartHints hints_;
    uint8_t* buffer_;
    int64_t capacity_;
    Job job_[5];
    int32_t jobs_ = 0;
};

}  // namespace qori
