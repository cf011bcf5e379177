// SPDX-License-Identifier: Apache-2.0
// Argument checks. Each returns QOR_OK or its status; a family writes `firstOf(...)` with its checks in their order.
#pragma once
#include "image/image.h"

namespace qori {

template <class... Results>
constexpr QorResult firstOf(Results... results) {
    QorResult first = QOR_OK;
    ((first = first == QOR_OK ? results : first), ...);
    return first;
}

template <class T>
bool isNull(T* pointer) {
    return pointer == nullptr;
}

template <class T>
bool isNull(Image<T> image) {
    return image.data == nullptr;
}

/// The array first, then each of its entries.
template <class T, int n>
bool isNull(Planes<T, n> planes) {
    if (planes.data == nullptr) return true;
    for (int i = 0; i < n; ++i)
        if (planes.data[i] == nullptr) return true;
    return false;
}

template <class... Arguments>
QorResult nullCheck(Arguments... arguments) {
    return (isNull(arguments) || ...) ? QOR_ERR_NULL_PTR : QOR_OK;
}

inline QorResult sizeCheck(QorImageSize size) { return size.width < 1 || size.height < 1 ? QOR_ERR_SIZE : QOR_OK; }

template <class... Images>
QorResult stepCheck(Images... images) {
    return ((images.step < 1) || ...) ? QOR_ERR_STEP : QOR_OK;
}

/// Whether a row of so many bytes, with whatever it needs around it, lies within its step.
inline QorResult rowCheck(int32_t step, int64_t bytes, QorResult refusal = QOR_ERR_STEP) {
    return bytes > step ? refusal : QOR_OK;
}

/// Steps that are whole elements.
template <class... Images>
QorResult alignedStepCheck(Images... images) {
    return ((images.step % elementBytes<std::remove_pointer_t<decltype(images.data)>> != 0) || ...) ? QOR_ERR_STEP_ALIGN
                                                                                                    : QOR_OK;
}

inline QorResult dataTypeCheck(int32_t code, auto... accepted) {
    return ((code == accepted) || ...) ? QOR_OK : QOR_ERR_DATA_TYPE;
}

/// Channel counts of operations that take 1, 3 and 4.
inline QorResult channelsCheck(int32_t count) {
    return count == 1 || count == 3 || count == 4 ? QOR_OK : QOR_ERR_CHANNELS_UNSUPPORTED;
}

inline QorResult roundModeCheck(int32_t mode) {
    return mode < roundTowardZero || mode > roundHalfAway ? QOR_ERR_ROUND_MODE : QOR_OK;
}

inline QorResult maskSizeCheck(QorImageSize mask) {
    return mask.width < 1 || mask.height < 1 ? QOR_ERR_MASK_SIZE : QOR_OK;
}

inline QorResult anchorCheck(QorPoint2D anchor, QorImageSize mask) {
    const bool inside = anchor.x >= 0 && anchor.x < mask.width && anchor.y >= 0 && anchor.y < mask.height;
    return inside ? QOR_OK : QOR_ERR_ANCHOR;
}

}  // namespace qori
