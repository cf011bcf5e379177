// SPDX-License-Identifier: Apache-2.0
#include "joins_run.h"

namespace qori::kernels {

const Joins<FloatKey> kKeyJoins[2] = {detail::joinsOf<Extreme<FloatKey, FloatKey, false>>(),
                                      detail::joinsOf<Extreme<FloatKey, FloatKey, true>>()};

template <bool largest>
void toKeys(const FloatKey* bits, FloatKey* keys, ptrdiff_t elements, ptrdiff_t ahead) {
    constexpr ptrdiff_t n = Vec<FloatKey>::lanes;
    constexpr int vectors = 4;
    const auto make = [=](ptrdiff_t i) __attribute__((always_inline)) {
        store(keys + i, detail::keysOf<largest>(load(bits + i)));
    };
    if (elements < n) return storePartial(keys, detail::keysOf<largest>(loadPartial(bits, elements)), elements);
    ptrdiff_t i = 0;
    for (; i <= elements - vectors * n; i += vectors * n) {
        __builtin_prefetch(bits + i + ahead), __builtin_prefetch(bits + i + 2 * n + ahead);
        for (int v = 0; v < vectors; ++v) make(i + v * n);
    }
    for (; i <= elements - n; i += n) make(i);
    make(elements - n);
}

template void toKeys<false>(const FloatKey*, FloatKey*, ptrdiff_t, ptrdiff_t);
template void toKeys<true>(const FloatKey*, FloatKey*, ptrdiff_t, ptrdiff_t);

}  // namespace qori::kernels
