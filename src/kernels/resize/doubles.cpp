// SPDX-License-Identifier: Apache-2.0
#include "doubles.h"

namespace qori::kernels {

template <int channels>
void linearRow64f(const double* row, const int32_t* const places[2], const double* fractions, ptrdiff_t padded,
                  double* out) {
    const auto* from = reinterpret_cast<const uint8_t*>(row);
    const auto pick = [from](const int32_t* at) {
        if constexpr (channels == kDoubles) return load(reinterpret_cast<const double*>(from + *at)).v;
        double p[kDoubles];
        for (double& element : p) __builtin_memcpy(&element, from + *at++, sizeof(double));
        return _mm256_setr_pd(p[0], p[1], p[2], p[3]);
    };
    for (ptrdiff_t i = 0; i < padded; i += kDoubles) {
        const __m256d f = load(fractions + i).v, rest = _mm256_sub_pd(_mm256_set1_pd(1), f);
        const __m256d sum = _mm256_mul_pd(rest, pick(places[0] + i));
        store(out + i, Vec<double>{_mm256_fmadd_pd(f, pick(places[1] + i), sum)});
    }
}

void linearColumn64f(const double* h0, const double* h1, double fraction, double* dst, ptrdiff_t elements) {
    const __m256d second = _mm256_set1_pd(fraction), first = _mm256_set1_pd(1 - fraction);
    for (ptrdiff_t i = 0; i < elements; i += kDoubles) {
        const __m256d sum = _mm256_mul_pd(first, load(h0 + i).v);
        storeUpTo(dst + i, Vec<double>{_mm256_fmadd_pd(second, load(h1 + i).v, sum)}, elements - i);
    }
}

template void linearRow64f<1>(const double*, const int32_t* const[2], const double*, ptrdiff_t, double*);
template void linearRow64f<3>(const double*, const int32_t* const[2], const double*, ptrdiff_t, double*);
template void linearRow64f<4>(const double*, const int32_t* const[2], const double*, ptrdiff_t, double*);

}  // namespace qori::kernels
