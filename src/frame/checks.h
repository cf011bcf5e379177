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

}  // namespace qori
