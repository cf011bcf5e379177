// SPDX-License-Identifier: Apache-2.0
// Operations on packed spectra. Inside, the parts of a frequency lie side by side in a row; in the first column, and
// the last of an even width, one above the other.
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/transform/spectrum_rows.h"

namespace qori::transform {
namespace {

using kernels::Frequency;

/// Where frequencies of a size lie.
class PackedPlaces {
public:
    explicit PackedPlaces(QorImageSize size) : size_(size) {}

    /// Frequencies of a row beside each other, from pixel 1 on.
    ptrdiff_t pairs() const { return (size_.width - 1) / 2; }

    /// Calls real(x, y, frequencyX, frequencyY) and pair(x, y, frequencyX, frequencyY), whose imaginary part is a row
    /// below, for the real columns.
    template <class Real, class Pair>
    void forColumns(Real real, Pair pair) const {
        forColumn(0, 0, real, pair);
        if (size_.width % 2 == 0) forColumn(size_.width - 1, size_.width / 2, real, pair);
    }

private:
    template <class Real, class Pair>
    void forColumn(int32_t x, int32_t frequency, Real real, Pair pair) const {
        real(x, 0, frequency, 0);
        for (int32_t m = 1; m < size_.height - m; ++m) pair(x, 2 * m - 1, frequency, m);
        if (size_.height % 2 == 0) real(x, size_.height - 1, frequency, size_.height / 2);
    }
    QorImageSize size_;
};

/// Element (x, y) of an image of so many channels, the first of them.
template <int channels, class T>
T* elementOf(Image<T> image, int32_t x, int32_t y) {
    return image.row(y) + ptrdiff_t{x} * channels;
}

template <Layout layout, class T, class Product, class Rows>
void multiplySpectra(Image<const T> a, Image<const T> b, Image<T> dst, QorImageSize roi, Product product, Rows rows) {
    constexpr int n = channels(layout), processed = processedChannels(layout);
    const PackedPlaces places(roi);
    places.forColumns(
        [=](int32_t x, int32_t y, int32_t, int32_t) {
            for (int c = 0; c < processed; ++c)
                elementOf<n>(dst, x, y)[c] = product.real(elementOf<n>(a, x, y)[c], elementOf<n>(b, x, y)[c]);
        },
        [=](int32_t x, int32_t y, int32_t, int32_t) {
            const auto at = [=](Image<const T> image, int c) {
                return Frequency<T>{elementOf<n>(image, x, y)[c], elementOf<n>(image, x, y + 1)[c]};
            };
            for (int c = 0; c < processed; ++c) {
                const Frequency<T> f = product(at(a, c), at(b, c));
                elementOf<n>(dst, x, y)[c] = f.re;
                elementOf<n>(dst, x, y + 1)[c] = f.im;
            }
        });
    for (int32_t y = 0; y < roi.height; ++y) rows(a.row(y) + n, b.row(y) + n, dst.row(y) + n, places.pairs());
}

template <class T>
QorResult productCheck(Image<const T> a, Image<const T> b, Image<T> dst, QorImageSize roi) {
    return firstOf(nullCheck(a, b, dst), stepCheck(a, b, dst), sizeCheck(roi));
}

template <bool conjugate, Layout layout>
QorResult multiplyFloats(Image<const float> a, Image<const float> b, Image<float> dst, QorImageSize roi) {
    if (QorResult r = productCheck(a, b, dst, roi)) return r;
    const kernels::FloatProduct<conjugate> product;
    return underDefaultControl([=] {
        multiplySpectra<layout>(
            a, b, dst, roi, product, [=](const float* x, const float* y, float* d, ptrdiff_t pairs) {
                if constexpr (layout == Layout::C1)
                    kernels::multiplyFloatPairs<conjugate>(x, y, d, pairs);
                else
                    kernels::multiplyPairs<channels(layout), processedChannels(layout)>(product, x, y, d, pairs);
            });
        return QOR_OK;
    });
}

/// Integers only: no control register.
template <class T, Layout layout>
QorResult multiplyPacked(Image<const T> a, Image<const T> b, Image<T> dst, QorImageSize roi, int32_t scaleFactor) {
    if (QorResult r = productCheck(a, b, dst, roi)) return r;
    const kernels::IntegerProduct<T> product{scaleFactor};
    multiplySpectra<layout>(a, b, dst, roi, product, [=](const T* x, const T* y, T* d, ptrdiff_t pairs) {
        kernels::multiplyPairs<channels(layout), processedChannels(layout)>(product, x, y, d, pairs);
    });
    return QOR_OK;
}

template <class T, Layout layout>
QorResult multiplyPacked(Image<const float> a, Image<const float> b, Image<float> dst, QorImageSize roi) {
    return multiplyFloats<false, layout>(a, b, dst, roi);
}

template <Layout layout>
QorResult multiplyPackedConjugate(Image<const float> a, Image<const float> b, Image<float> dst, QorImageSize roi) {
    return multiplyFloats<true, layout>(a, b, dst, roi);
}

// --- images of every frequency ---------------------------------------------------------------------------------------

/// Each frequency of the packed layout where it belongs, and its conjugate at the opposite place.
template <Layout layout, class T, class Value>
QorResult evaluate(Image<const T> src, Image<T> dst, QorImageSize roi, Value value) {
    constexpr int n = channels(layout);
    const PackedPlaces places(roi);
    const auto opposite = [=](int32_t y) { return y == 0 ? 0 : roi.height - y; };
    places.forColumns(
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            for (int c = 0; c < n; ++c)
                elementOf<n>(dst, fx, fy)[c] = value(Frequency<T>{elementOf<n>(src, x, y)[c], 0});
        },
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            for (int c = 0; c < n; ++c) {
                const Frequency<T> f = {elementOf<n>(src, x, y)[c], elementOf<n>(src, x, y + 1)[c]};
                const T made = value(f);
                elementOf<n>(dst, fx, fy)[c] = made;
                elementOf<n>(dst, fx, opposite(fy))[c] = value.mirrored(made, f);
            }
        });
    if (places.pairs() == 0) return QOR_OK;
    for (int32_t y = 0; y < roi.height; ++y)
        kernels::evaluatePairs<n>(value, src.row(y) + n, dst.row(y) + n, elementOf<n>(dst, roi.width - 1, opposite(y)),
                                  places.pairs());
    return QOR_OK;
}

template <Layout layout, class T, class Value>
QorResult evaluatePacked(Image<const T> src, Image<T> dst, QorImageSize roi, Value value) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi))) return r;
    return underDefaultControl([=] { return evaluate<layout>(src, dst, roi, value); });
}

template <class T, Layout layout>
QorResult magnitudePacked(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scaleFactor = 0) {
    if constexpr (std::is_same_v<T, float>)
        return evaluatePacked<layout>(src, dst, roi, kernels::FloatMagnitude{});
    else
        return evaluatePacked<layout>(src, dst, roi, kernels::IntegerMagnitude<T>{scaleFactor});
}

template <class T, Layout layout>
QorResult phasePacked(Image<const T> src, Image<T> dst, QorImageSize roi, int32_t scaleFactor = 0) {
    if constexpr (std::is_same_v<T, float>)
        return evaluatePacked<layout>(src, dst, roi, kernels::FloatPhase{});
    else
        return evaluatePacked<layout>(src, dst, roi, kernels::IntegerPhase<T>{scaleFactor});
}

// --- to complex images and back: moves, no arithmetic but signs ------------------------------------------------------

float negated(float v) { return -v; }
int32_t negated(int32_t v) { return v == INT32_MIN ? INT32_MAX : -v; }

template <class T, class C>
QorResult extendPacked(Image<const T> src, Image<C> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi))) return r;
    const PackedPlaces places(roi);
    const auto opposite = [=](int32_t y) { return y == 0 ? 0 : roi.height - y; };
    places.forColumns(
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            dst.row(fy)[fx] = C{src.row(y)[x], 0};
        },
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            const T re = src.row(y)[x], im = src.row(y + 1)[x];
            dst.row(fy)[fx] = C{re, im};
            dst.row(opposite(fy))[fx] = C{re, negated(im)};
        });
    for (int32_t y = 0; y < roi.height; ++y) {
        const T* const from = src.row(y) + 1;
        C *const to = dst.row(y) + 1, *const mirror = dst.row(opposite(y)) + roi.width - 1;
        for (ptrdiff_t k = 0; k < places.pairs(); ++k) {
            to[k] = C{from[2 * k], from[2 * k + 1]};
            mirror[-k] = C{from[2 * k], negated(from[2 * k + 1])};
        }
    }
    return QOR_OK;
}

template <class C, class T, Layout layout>
QorResult packExtended(Image<const C> src, Image<T> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), stepCheck(src, dst), sizeCheck(roi))) return r;
    constexpr int n = channels(layout);
    const PackedPlaces places(roi);
    places.forColumns(
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            for (int c = 0; c < n; ++c) elementOf<n>(dst, x, y)[c] = elementOf<n>(src, fx, fy)[c].re;
        },
        [=](int32_t x, int32_t y, int32_t fx, int32_t fy) {
            for (int c = 0; c < n; ++c) {
                elementOf<n>(dst, x, y)[c] = elementOf<n>(src, fx, fy)[c].re;
                elementOf<n>(dst, x, y + 1)[c] = elementOf<n>(src, fx, fy)[c].im;
            }
        });
    for (int32_t y = 0; y < roi.height; ++y) {
        const C* from = src.row(y) + n;
        T* to = dst.row(y) + n;
        for (ptrdiff_t k = 0; k < places.pairs(); ++k, from += n, to += 2 * n)
            for (int c = 0; c < n; ++c) {
                to[c] = from[c].re;
                to[c + n] = from[c].im;
            }
    }
    return QOR_OK;
}

}  // namespace
}  // namespace qori::transform

#include "entries/spectrum.inc"
