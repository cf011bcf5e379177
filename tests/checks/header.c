/* SPDX-License-Identifier: Apache-2.0 */
#include "qori.h"

int main(void) {
    int32_t step = 0;
    uint8_t* image = qoriMalloc_8u_C1(5, 5, &step);
    const QorImageSize roi = {5, 5};
    const QorResult result = qoriSet_8u_C1R(7, image, step, roi);
    const int wrong = result != QOR_OK || image[4 * step + 4] != 7;
    qoriFree(image);
    return wrong;
}
