// SPDX-License-Identifier: Apache-2.0
#include "extreme.h"

#include "extreme_run.h"
#include "square_extreme.h"

namespace qori::filter {
namespace {

/// Out of place a region is done in tiles of columns, so that the rows in work stay in the second-level cache. Narrower
/// tiles lose more by short rows than they gain: 3840 columns of bytes by 7 x 7, whose rows in work take 120 KB, cost
/// 1.12 and 1.8 times as much in halves and in tiles of 512 columns; by 61 x 61, 323 KB, 1.13 and 1.7 times.
constexpr int64_t kCached = 1024 * 1024;
constexpr int64_t kOnStack = 32 * 1024;

template <class Run, class T>
int64_t workBytes(const ExtremeTask<T>& task, int32_t width) {
    WorkBuffer measured(nullptr);
    const ExtremeTask<T> tile = task.columns(0, width);
    const Run run(tile, measured);
    return measured.bytes();
}

/// The width of tiles whose work memory keeps to a limit, if any does.
template <class Run, class T>
int32_t tileWidth(const ExtremeTask<T>& task, int64_t limit) {
    if (task.isInPlace) return task.roi.width;
    constexpr int32_t kLeast = 64 / static_cast<int32_t>(sizeof(T));
    int32_t tiles = 1, width = task.roi.width;
    while (width > kLeast && workBytes<Run>(task, width) > limit) {
        tiles = tiles < INT32_MAX / 2 ? 2 * tiles : INT32_MAX;
        width = std::max(kLeast, static_cast<int32_t>(roundUp((int64_t{task.roi.width} - 1) / tiles + 1, kLeast)));
    }
    return std::min(width, task.roi.width);
}

template <class Run, class T>
void runTiles(const ExtremeTask<T>& task, int32_t width, uint8_t* memory) {
    for (int64_t x = 0; x < task.roi.width; x += width) {
        const auto left = static_cast<int32_t>(x);
        const ExtremeTask<T> tile = task.columns(left, std::min(width, task.roi.width - left));
        WorkBuffer work(memory);
        Run(tile, work).run();
    }
}

template <class Run, class T>
QORI_NOINLINE QorResult runOnStack(const ExtremeTask<T>& task) {
    const int32_t width = tileWidth<Run>(task, kOnStack);
    if (workBytes<Run>(task, width) > kOnStack) return QOR_ERR_NO_MEMORY;
    uint8_t memory[kOnStack];
    runTiles<Run>(task, width, memory);
    return QOR_OK;
}

template <class Run, class T>
QorResult runIn(const ExtremeTask<T>& task, WorkFrom from) {
    if (from == WorkFrom::stackIfItFits && workBytes<Run>(task, task.roi.width) <= kOnStack)
        return runOnStack<Run>(task);
    const int32_t width = tileWidth<Run>(task, kCached);
    const WorkMemory memory(workBytes<Run>(task, width));
    if (memory.check() != QOR_OK) return from == WorkFrom::allocator ? QOR_ERR_NO_MEMORY : runOnStack<Run>(task);
    runTiles<Run>(task, width, memory.begin<uint8_t>());
    return QOR_OK;
}

/// Whether a window is all of 3 x 3 pixels, with or without zeros around them in its mask.
bool isSquare(const Window& window, const QorImageRect& box) {
    if (box.width != 3 || box.height != 3) return false;
    for (int32_t k = 0; k < 9; ++k)
        if (!window.has(window.anchor.x + box.x + k % 3, window.anchor.y + box.y + k / 3)) return false;
    return true;
}

/// By the square's own kernels, which make four rows at a time and keep no block of rows; for floats too, whose results
/// are those of keys. Out of place any anchor will do, the source being read from further on.
template <bool largest, class S>
QorResult squareOf(Image<const S> src, Image<S> dst, QorImageSize roi, Layout layout, const QorImageRect& box,
                   bool isInPlace) {
    using Order = std::conditional_t<largest, kernels::Dilation<S>, kernels::Erosion<S>>;
    if (isInPlace) return squareExtremeInPlace<Order>(dst, roi, layout);
    const S* const middle = src.row(box.y + 1) + ptrdiff_t{box.x + 1} * channels(layout);
    squareExtreme<Order>(Image<const S>{middle, src.step}, dst, roi, layout);
    return QOR_OK;
}

template <class T>
QorResult runCover(const ExtremeTask<T>& task, WorkFrom from) {
    return task.cover.rects > 0 ? runIn<RectRun<T>>(task, from) : runIn<TapRun<T>>(task, from);
}

template <class S>
const auto& joinsOf(bool largest) {
    if constexpr (std::is_same_v<S, uint8_t>)
        return kernels::kByteJoins[largest];
    else if constexpr (std::is_same_v<S, uint16_t>)
        return kernels::kWordJoins[largest];
    else if constexpr (std::is_same_v<S, int16_t>)
        return kernels::kSignedWordJoins[largest];
    else
        return kernels::kKeyJoins[largest];
}

template <class T>
struct ElementOf;
template <class T>
struct ElementOf<kernels::Joins<T>> {
    using Type = T;
};

}  // namespace

template <class S, bool largest>
QorResult extremeOf(Image<const S> src, Image<S> dst, QorImageSize roi, Layout layout, const Window& window,
                    WorkFrom memory) {
    const auto& joins = joinsOf<S>(largest);
    using T = typename ElementOf<std::remove_cvref_t<decltype(joins)>>::Type;
    ExtremeTask<T> task{{reinterpret_cast<const T*>(src.data), src.step},
                        {reinterpret_cast<T*>(dst.data), dst.step},
                        roi,
                        channels(layout),
                        src.data == dst.data && src.step == dst.step,
                        window,
                        coverOf(window),
                        &joins,
                        {layout == Layout::AC4, false},
                        nullptr};
    const QorImageRect& box = task.cover.box;
    const bool isCentred = box.x == -1 && box.y == -1;
    if (isSquare(window, box) && (isCentred || !task.isInPlace))
        if (squareOf<largest>(src, dst, roi, layout, box, task.isInPlace) == QOR_OK) return QOR_OK;
    // Without memory for it in place, the square is a rectangle like others.
    // One pixel is what it is, payloads of NaNs included.
    if constexpr (std::is_floating_point_v<S>)
        if (!task.cover.isOnePixel()) {
            task.finish.decodes = true;
            task.toKeys = kernels::toKeys<largest>;
        }
    return runCover(task, memory);
}

#define QORI_EXTREMES(S)                                                                                             \
    template QorResult extremeOf<S, false>(Image<const S>, Image<S>, QorImageSize, Layout, const Window&, WorkFrom); \
    template QorResult extremeOf<S, true>(Image<const S>, Image<S>, QorImageSize, Layout, const Window&, WorkFrom);
QORI_EXTREMES(uint8_t)
QORI_EXTREMES(uint16_t)
QORI_EXTREMES(int16_t)
QORI_EXTREMES(float)
#undef QORI_EXTREMES

}  // namespace qori::filter
