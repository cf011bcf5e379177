/* SPDX-License-Identifier: Apache-2.0
 * A program for the import libraries that MSVC links: built for its target without its headers or its run-time library.
 * Ends with the number of the first call that went wrong, or with 0. Arguments of every size pass by value.
 */
#include <qori.h>

int _fltused = 1; /* what this target's compilers ask the run-time library for where there are floats */

enum { W = 37, H = 9, STEP = 48, PIXELS = W * H };

static uint8_t a[H][STEP], b[H][STEP], c[H][STEP];
static float f[H][STEP], g[H][STEP];
static int16_t s[H][STEP], t[H][STEP];
static uint8_t plan[1 << 16];

int start(void) {
    const QorImageSize size = {W, H};
    const QorImageRect tile = {3, 2, 5, 4};
    const QorPoint2D centre = {1, 1};
    const QorImageSize mask = {3, 3};
    QorImageRect source = {0, 0, 0, 0}, inner = {0, 0, 0, 0};
    int32_t step = 0, planBytes = 0, initBytes = 0, count = 0;
    uint8_t low = 0, high = 0, threshold = 0;
    double value = 0;

    if (qoriGetLibVersion()->versionMajor != 8) return 1;
    uint8_t* image = qoriMalloc_8u_C1(W, H, &step);
    if (image == 0 || step != 64) return 2;
    qoriFree(image); /* 3 */
    if (qoriSet_8u_C1R(100, a[0], STEP, size) || a[H - 1][W - 1] != 100 || a[0][W] != 0) return 4;
    if (qoriAddC_8u_C1RSfs(a[0], STEP, 21, b[0], STEP, size, 1) || b[3][5] != 60) return 5;
    if (qoriThreshold_LTVal_8u_C1R(b[0], STEP, c[0], STEP, size, 70, 7) || c[8][36] != 7) return 6;
    if (qoriSum_8u_C1R(c[0], STEP, size, &value) || value != 7.0 * PIXELS) return 7;
    if (qoriMean_8u_C1R(a[0], STEP, size, &value) || value != 100) return 8;
    if (qoriNormDiff_Inf_8u_C1R(a[0], STEP, b[0], STEP, size, &value) || value != 40) return 9;
    a[4][6] = 200;
    if (qoriMinMax_8u_C1R(a[0], STEP, size, &low, &high) || low != 100 || high != 200) return 10;
    if (qoriCountInRange_8u_C1R(a[0], STEP, size, &count, 150, 255) || count != 1) return 11;
    if (qoriComputeThreshold_Otsu_8u_C1R(a[0], STEP, size, &threshold) || threshold < 100 || threshold >= 200)
        return 12;
    if (qoriMirror_8u_C1R(a[0], STEP, b[0], STEP, size, flipBothAxes) || b[H - 1 - 4][W - 1 - 6] != 200) return 13;
    if (qoriSet_32f_C1R(2.5f, f[0], sizeof f[0], size) || f[8][36] != 2.5f) return 14;
    if (qoriMulC_32f_C1R(f[0], sizeof f[0], 4.0f, g[0], sizeof g[0], size) || g[8][36] != 10.0f) return 15;
    if (qoriScale_8u32f_C1R(a[0], STEP, g[0], sizeof g[0], size, -255, 255) || g[8][36] != -55) return 16;
    if (qoriConvert_8u32f_C1R(a[0], STEP, f[0], sizeof f[0], size) || f[4][6] != 200.0f) return 17;
    s[1][1] = -5;
    if (qoriAbs_16s_C1R(s[0], sizeof s[0], t[0], sizeof t[0], size) || t[1][1] != 5) return 18;
    const QorImageSize middle = {W - 2, H - 2};
    if (qoriFilterMedian_8u_C1R(&a[1][1], STEP, c[0], STEP, middle, mask, centre) || c[3][5] != 100) return 19;
    if (qoriFilterBox_8u_C1R(&a[1][1], STEP, c[0], STEP, middle, mask, centre) || c[3][5] != 111) return 20;
    if (qoriResizeGetSize_8u(size, size, interpLinear, 0, &planBytes, &initBytes) || planBytes > (int32_t)sizeof plan)
        return 21;
    if (qoriResizeLinearInit_8u(size, size, (QorResizePlan*)plan)) return 22;
    if (qoriResizeGetSrcRoi_8u((const QorResizePlan*)plan, tile, &source, &inner) || source.x > 3 || source.width < 5)
        return 23;
    return 0;
}
