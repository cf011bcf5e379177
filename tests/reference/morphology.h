// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements, met one by one.
#pragma once
#include <cmath>
#include <limits>
#include <type_traits>

namespace qori::reference {

/// -0 is below +0; NaN where there was no number.
template <class T, bool largest>
class Extreme {
public:
    void meet(T element) {
        const bool isNumber = element == element;
        if (isNumber && (!any_ || (largest ? isBelow(best_, element) : isBelow(element, best_))))
            best_ = element, any_ = true;
    }
    T value() const { return any_ ? best_ : std::numeric_limits<T>::quiet_NaN(); }

private:
    static bool isBelow(T a, T b) {
        if constexpr (std::is_floating_point_v<T>)
            if (a == b) return std::signbit(a) && !std::signbit(b);
        return a < b;
    }

    T best_{};
    bool any_ = false;
};

}  // namespace qori::reference
