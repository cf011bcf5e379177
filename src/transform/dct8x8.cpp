// SPDX-License-Identifier: Apache-2.0
// The cosine transform of single 8x8 blocks.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/dct/reduced.h"
#include "kernels/dct/zigzag.h"

namespace qori::transform {
namespace {

namespace dct8 = kernels::dct8;

constexpr int32_t kBlockStep = 8 * elementBytes<int16_t>;

/// Blocks of any values go through floats, which read the control register; the 16-bit lanes do not.
template <class Body>
QORI_NOINLINE QorResult inFloats(Body body) {
    return underDefaultControl([&] {
        body();
        return QOR_OK;
    });
}

// --- whole blocks ---------------------------------------------------------------------------------------------------

QorResult forwardBlock(const float* src, float* dst) {
    const QorResult checked = nullCheck(src, dst);
    return checked != QOR_OK ? checked : underDefaultControl([=] {
        dct8::forwardFloats(src, dst);
        return QOR_OK;
    });
}

QorResult inverseBlock(const float* src, float* dst) {
    const QorResult checked = nullCheck(src, dst);
    return checked != QOR_OK ? checked : underDefaultControl([=] {
        dct8::inverseFloats(src, dst);
        return QOR_OK;
    });
}

/// The pixels are gathered where they do not fit 16-bit lanes.
QORI_NOINLINE QorResult forwardWide(Image<const int16_t> src, int16_t* dst) {
    int16_t block[64];
    for (int y = 0; y < 8; ++y) __builtin_memcpy(block + 8 * y, src.row(y), kBlockStep);
    return inFloats([&] { dct8::forwardWide(block, dst); });
}

QorResult forwardRows(Image<const int16_t> src, int16_t* dst) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src))) return r;
    return dct8::forwardWordBlock(src, dst) ? QOR_OK : forwardWide(src, dst);
}

QorResult forwardBlock(const int16_t* src, int16_t* dst) { return forwardRows({src, kBlockStep}, dst); }

QorResult forwardShifted(Image<const uint8_t> src, int16_t* dst, int16_t addVal) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src))) return r;
    if (addVal >= -256 && addVal <= 0) {
        dct8::forwardByteBlock(src, addVal, dst);
        return QOR_OK;
    }
    dct8::storeRaised(src, addVal, dst);
    return forwardBlock(dst, dst);
}

QorResult forwardRows(Image<const uint8_t> src, int16_t* dst) { return forwardShifted(src, dst, 0); }

/// Pixels of any coefficients, made by fast where it can and by wide, into a block of words, where it cannot.
template <class Fast, class Wide, class... Range, class D>
QORI_INLINE QorResult inverseWith(Fast fast, Wide wide, const int16_t* src, Image<D> dst, Range... range) {
    dct8::PixelRows pixels;
    if (!fast(src, pixels)) [[unlikely]] {
        int16_t block[64];
        inFloats([&] { wide(src, block); });
        pixels = dct8::pixelsOf(block);
    }
    dct8::storePixels(pixels, dst, range...);
    return QOR_OK;
}

template <class D, class... Range>
QORI_INLINE QorResult inversePixels(const int16_t* src, Image<D> dst, Range... range) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(dst))) return r;
    return inverseWith(dct8::inverseWords, dct8::inverseWide, src, dst, range...);
}

QorResult inverseRows(const int16_t* src, Image<int16_t> dst) { return inversePixels(src, dst); }

QorResult inverseBlock(const int16_t* src, int16_t* dst) { return inversePixels(src, Image<int16_t>{dst, kBlockStep}); }

QorResult inverseRows(const int16_t* src, Image<uint8_t> dst) { return inversePixels(src, dst, dct8::ByteRange{}); }

QorResult inverseClipped(const int16_t* src, Image<uint8_t> dst, int16_t addVal, uint8_t clipDown, uint8_t clipUp) {
    return inversePixels(src, dst, dct8::ByteRange{addVal, clipDown, clipUp});
}

// --- few coefficients, few pixels -----------------------------------------------------------------------------------

template <int n>
QorResult inverseLow(const int16_t* src, int16_t* dst) {
    if (QorResult r = nullCheck(src, dst)) return r;
    return inverseWith(dct8::inverseLowWords<n>, dct8::inverseLowWide<n>, src, Image<int16_t>{dst, kBlockStep});
}

template <int n>
QorResult inverseTo(const int16_t* src, int16_t* dst) {
    if (QorResult r = nullCheck(src, dst)) return r;
    if constexpr (n == 4) return inFloats([=] { dct8::inverseToFour(src, dst); });
    dct8::inverseToTwo(src, dst);
    return QOR_OK;
}

QorResult inverseAccurate(const int16_t* src, int16_t* dst) {
    if (QorResult r = nullCheck(src, dst)) return r;
    return inFloats([=] { dct8::inverseWide(src, dst); });
}

// --- order ----------------------------------------------------------------------------------------------------------

template <const dct8::OrderMasks& masks>
QorResult reorder(const int16_t* src, int16_t* dst) {
    if (QorResult r = nullCheck(src, dst)) return r;
    dct8::reorderBlock<masks>(src, dst);
    return QOR_OK;
}

QorResult zigzag(const int16_t* src, int16_t* dst) { return reorder<dct8::kZigzag>(src, dst); }
QorResult fromZigzag(const int16_t* src, int16_t* dst) { return reorder<dct8::kFromZigzag>(src, dst); }

}  // namespace
}  // namespace qori::transform

#include "entries/dct8x8.inc"
