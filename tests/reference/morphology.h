// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements, met one by one.
#pragma once
#include <limits>

namespace qori::reference {

/// Of equal elements the last; NaN where there was no number.
template <class T, bool largest>
class Extreme {
public:
    void meet(T element) {
        const bool isNumber = element == element;
        if (isNumber && (!any_ || (largest ? element >= best_ : element <= best_))) best_ = element, any_ = true;
    }
    T value() const { return any_ ? best_ : std::numeric_limits<T>::quiet_NaN(); }

private:
    T best_{};
    bool any_ = false;
};

}  // namespace qori::reference
