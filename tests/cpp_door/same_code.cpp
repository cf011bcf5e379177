// SPDX-License-Identifier: Apache-2.0
// Pairs of functions that do one thing: c_NAME by qori.h, door_NAME by qori.hpp. Their code is the same.
#include "qori.hpp"

using namespace qori;

#define PAIR_ARGUMENTS const uint8_t *a, int32_t aStep, const uint8_t *b, int32_t bStep, uint8_t *d, int32_t dStep
extern "C" {

QorResult c_add(PAIR_ARGUMENTS, QorImageSize size) { return qoriAdd_8u_C3RSfs(a, aStep, b, bStep, d, dStep, size, 1); }
QorResult door_add(PAIR_ARGUMENTS, QorImageSize size) {
    using V = View<const uint8_t, C3>;
    return add(V(a, aStep, size), V(b, bStep, size), View<uint8_t, C3>(d, dStep, size), 1);
}

QorResult c_subtract(PAIR_ARGUMENTS, QorImageSize size) {
    return qoriSub_8u_C1RSfs(b, bStep, a, aStep, d, dStep, size, 0);
}
QorResult door_subtract(PAIR_ARGUMENTS, QorImageSize size) {
    using V = View<const uint8_t>;
    return subtract(V(a, aStep, size), V(b, bStep, size), View<uint8_t>(d, dStep, size));
}

QorResult c_threshold(float* image, int32_t step, QorImageSize size, float limit) {
    return qoriThreshold_GTVal_32f_C1IR(image, step, size, limit, 0.5f);
}
QorResult door_threshold(float* image, int32_t step, QorImageSize size, float limit) {
    return threshold_gt(in_place(View<float>(image, step, size)), limit, 0.5f);
}

QorResult c_sum(const uint16_t* image, int32_t step, QorImageSize size, double* sums) {
    return qoriSum_16u_C4R(image, step, size, sums);
}
QorResult door_sum(const uint16_t* image, int32_t step, QorImageSize size, double* sums) {
    return sum(View<const uint16_t, C4>(image, step, size), *reinterpret_cast<double(*)[4]>(sums));
}

QorResult c_copy(PAIR_ARGUMENTS, QorImageSize size) {
    (void)bStep;
    return qoriCopy_8u_C1MR(a, aStep, d, dStep, size, b, dStep);
}
QorResult door_copy(PAIR_ARGUMENTS, QorImageSize size) {
    (void)bStep;
    using V = View<const uint8_t>;
    return copy(V(a, aStep, size), View<uint8_t>(d, dStep, size), V(b, dStep, size));
}

QorResult c_box(const uint8_t* a, int32_t aStep, uint8_t* d, int32_t dStep, QorImageSize size) {
    return qoriFilterBox_8u_C4R(a, aStep, d, dStep, size, {5, 3}, {2, 1});
}
QorResult door_box(const uint8_t* a, int32_t aStep, uint8_t* d, int32_t dStep, QorImageSize size) {
    return filter_box(View<const uint8_t, C4>(a, aStep, size), View<uint8_t, C4>(d, dStep, size), {5, 3});
}
}
