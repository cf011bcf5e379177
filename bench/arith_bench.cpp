// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <type_traits>

#include "bench.h"

namespace qori::bench {
namespace {

template <class T>
struct PartOf {
    using type = T;
};
template <class T>
requires requires(T t) { t.re; }
struct PartOf<T> {
    using type = decltype(T::re);
};

/// An image of any element type. No element is zero and few results saturate.
template <class T>
class Pixels {
    using Part = typename PartOf<T>::type;
    static constexpr int count = sizeof(T) / sizeof(Part);

public:
    Pixels(Size size, int channels) : image_(size, channels * count) {
        for (int y = 0; y < size.height; ++y)
            for (int i = 0; i < image_.elements(); ++i) image_.row(y)[i] = static_cast<Part>((i * 7 + y) % 251 + 1);
    }
    T* data() const { return reinterpret_cast<T*>(image_.data()); }
    T* row(int y) const { return reinterpret_cast<T*>(image_.row(y)); }
    int32_t step() const { return image_.step(); }
    const Image<Part>& parts() const { return image_; }

private:
    Image<Part> image_;
};

template <class T, int channels>
struct Images {
    explicit Images(Size size) : a(size, channels), b(size, channels), dst(size, channels) {}
    Pixels<T> a, b, dst;
};

/// The loop that a user would write; element(a, b) is inlined into it.
template <int channels, class T, class Element>
void plainRows(const Pixels<T>& a, const Pixels<T>& b, const Pixels<T>& dst, Size size, Element element) {
    for (int y = 0; y < size.height; ++y) {
        const T *p = a.row(y), *q = b.row(y);
        T* d = dst.row(y);
        for (int i = 0; i < size.width * channels; ++i) d[i] = element(p[i], q[i]);
        keep(d);
    }
}

std::vector<Size> withSmall() {
    std::vector<Size> sizes = kSizes;
    sizes.push_back(kSmall);
    return sizes;
}

template <class T, int channels = 1, class Function, class Element, class... Scale>
Row binary(std::string name, double bestAtL2, double bestAtFrame, Function function, Element element, Scale... scale) {
    const auto make = [=](Size size) {
        const Images<T, channels> images(size);
        return Contenders{[=] {
                              must(function(images.a.data(), images.a.step(), images.b.data(), images.b.step(),
                                            images.dst.data(), images.dst.step(), size.roi(), scale...));
                          },
                          [=] { plainRows<channels>(images.a, images.b, images.dst, size, element); },
                          {},
                          outputOf(images.dst.parts())};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 3.0 * channels * sizeof(T),
            .sizes = withSmall(),
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

/// element(value, a); every channel has a value of its own.
template <class T, int channels = 1, class Function, class Element, class... Scale>
Row constant(std::string name, double bestAtL2, double bestAtFrame, Function function, Element element,
             Scale... scale) {
    const auto make = [=](Size size) {
        const Images<T, channels> images(size);
        return Contenders{[=] {
                              const T values[4] = {T(3), T(5), T(7), T(9)};
                              const auto value = [&] {
                                  if constexpr (channels == 1)
                                      return values[0];
                                  else
                                      return values;
                              }();
                              must(function(images.a.data(), images.a.step(), value, images.dst.data(),
                                            images.dst.step(), size.roi(), scale...));
                          },
                          [=] {
                              const int width = size.width,
                                        height = size.height;  // the closure's might change with the stores
                              T hidden[4] = {T(3), T(5), T(7), T(9)};
                              keep(hidden);
                              T values[channels];  // never shown to anyone, so that the stores below cannot change it
                              std::copy_n(hidden, channels, values);
                              for (int y = 0; y < height; ++y) {
                                  const T* s = images.a.row(y);
                                  T* d = images.dst.row(y);
                                  for (int x = 0; x < width * channels; x += channels)
                                      for (int c = 0; c < channels; ++c) d[x + c] = element(values[c], s[x + c]);
                                  keep(d);
                              }
                          },
                          {},
                          outputOf(images.dst.parts())};
    };
    return {.operation = std::move(name),
            .bytesPerPixel = 2.0 * channels * sizeof(T),
            .sizes = withSmall(),
            .make = make,
            .bestAtL2 = bestAtL2,
            .bestAtFrame = bestAtFrame};
}

template <class T>
T clamped(int64_t v) {
    return static_cast<T>(std::clamp<int64_t>(v, std::numeric_limits<T>::min(), std::numeric_limits<T>::max()));
}
/// In 32 bits where they suffice, as a careful user would.
template <class T>
T clamped(int v) {
    return static_cast<T>(std::clamp<int>(v, std::numeric_limits<T>::min(), std::numeric_limits<T>::max()));
}
inline int roundShift(int v, int s) { return (v + ((v >> s) & 1) + (1 << (s - 1)) - 1) >> s; }

template <class T>
constexpr auto sum = [](T a, T b) { return clamped<T>(a + b); };
template <class T, int s>
constexpr auto scaledSum = [](T a, T b) { return clamped<T>(roundShift(a + b, s)); };
template <class T>
constexpr auto difference = [](T a, T b) { return clamped<T>(b - a); };
template <class T>
constexpr auto product = [](T a, T b) { return clamped<T>(a * b); };
template <class T, int s>
constexpr auto scaledProduct = [](T a, T b) { return clamped<T>(roundShift(a * b, s)); };
constexpr auto product16u = [](uint16_t a, uint16_t b) {
    return static_cast<uint16_t>(std::min(uint32_t{a} * b, 65535u));
};
constexpr auto complexProduct = [](QorComplex16s a, QorComplex16s b) {
    return QorComplex16s{clamped<int16_t>(int64_t{a.re} * b.re - a.im * b.im),
                         clamped<int16_t>(int64_t{a.re} * b.im + int64_t{a.im} * b.re)};
};
constexpr auto complexProduct32 = [](QorComplex32s a, QorComplex32s b) {
    return QorComplex32s{clamped<int32_t>(int64_t{a.re} * b.re - int64_t{a.im} * b.im),
                         clamped<int32_t>(int64_t{a.re} * b.im + int64_t{a.im} * b.re)};
};
/// Exact, as the sums need more bits than a double has.
constexpr auto wideQuotient = [](QorComplex32s a, QorComplex32s b) {
    __extension__ using Wide = __int128;
    const Wide norm = Wide{a.re} * a.re + Wide{a.im} * a.im;
    if (norm == 0) return QorComplex32s{};
    const auto rounded = [&](Wide n) {
        const Wide q = n / norm, twice = 2 * (n % norm), size = twice < 0 ? -twice : twice;
        const bool away = size > norm || (size == norm && q % 2 != 0);
        return clamped<int32_t>(static_cast<int64_t>(q) + (away ? (n < 0 ? -1 : 1) : 0));
    };
    return QorComplex32s{rounded(Wide{b.re} * a.re + Wide{b.im} * a.im),
                         rounded(Wide{b.im} * a.re - Wide{b.re} * a.im)};
};
constexpr auto complexQuotient = [](auto a, auto b) {
    const double norm = double(a.re) * a.re + double(a.im) * a.im;
    if (norm == 0) return decltype(a){};
    const double re = double(b.re) * a.re + double(b.im) * a.im, im = double(b.im) * a.re - double(b.re) * a.im;
    using Part = decltype(a.re);
    const auto element = [](double x, double y) { return decltype(a){static_cast<Part>(x), static_cast<Part>(y)}; };
    if constexpr (std::is_same_v<Part, float>)
        return element(re / norm, im / norm);
    else
        return element(std::nearbyint(re / norm), std::nearbyint(im / norm));
};
bool zeroMet = false;
template <class T>
constexpr auto quotient = [](T a, T b) {
    if (a == 0) return T(b == 0 ? 0 : std::numeric_limits<T>::max());
    return clamped<T>(static_cast<int>(std::nearbyint(float(b) / float(a))));
};
/// With the results and the note of zero divisors.
constexpr auto floatQuotient = [](float a, float b) {
    const float infinity = std::numeric_limits<float>::infinity();
    const float overZero = b == 0 || b != b ? std::numeric_limits<float>::quiet_NaN() : std::copysign(infinity, b);
    zeroMet |= a == 0;
    return a == 0 ? overZero : b / a;
};
constexpr auto fractionProduct = [](auto a, auto b) {
    using T = decltype(a);
    constexpr uint32_t max = std::numeric_limits<T>::max();
    return static_cast<T>((uint32_t{a} * b + max / 2) / max);
};

const Rows rows{{
    binary<uint8_t>("add 8u C1 sfs 0", 40'048, 10'930, qoriAdd_8u_C1RSfs, sum<uint8_t>, 0),
    binary<uint8_t>("add 8u C1 sfs 1", 0, 0, qoriAdd_8u_C1RSfs, scaledSum<uint8_t, 1>, 1),
    binary<uint8_t>("add 8u C1 sfs 3", 0, 0, qoriAdd_8u_C1RSfs, scaledSum<uint8_t, 3>, 3),
    binary<uint16_t>("add 16u C1 sfs 1", 0, 0, qoriAdd_16u_C1RSfs, scaledSum<uint16_t, 1>, 1),
    binary<int16_t>("add 16s C1 sfs 0", 16'345, 4'786, qoriAdd_16s_C1RSfs, sum<int16_t>, 0),
    binary<float>("add 32f C1", 3'243, 2'316, qoriAdd_32f_C1R, [](float a, float b) { return a + b; }),
    binary<uint8_t>("sub 8u C1 sfs 0", 0, 0, qoriSub_8u_C1RSfs, difference<uint8_t>, 0),
    binary<int16_t>("sub 16s C1 sfs 0", 0, 0, qoriSub_16s_C1RSfs, difference<int16_t>, 0),
    binary<uint8_t>("mul 8u C1 sfs 0", 14'476, 9'794, qoriMul_8u_C1RSfs, product<uint8_t>, 0),
    binary<uint8_t>("mul 8u C1 sfs 8", 4'884, 3'883, qoriMul_8u_C1RSfs, scaledProduct<uint8_t, 8>, 8),
    binary<uint16_t>("mul 16u C1 sfs 0", 0, 0, qoriMul_16u_C1RSfs, product16u, 0),
    binary<int16_t>("mul 16s C1 sfs 8", 0, 0, qoriMul_16s_C1RSfs, scaledProduct<int16_t, 8>, 8),
    binary<QorComplex16s>("mul 16sc C1 sfs 0", 0, 0, qoriMul_16sc_C1RSfs, complexProduct, 0),
    binary<QorComplex32s>("mul 32sc C1 sfs 0", 0, 0, qoriMul_32sc_C1RSfs, complexProduct32, 0),
    binary<QorComplex32f>("mul 32fc C1", 0, 0, qoriMul_32fc_C1R,
                          [](QorComplex32f a, QorComplex32f b) {
                              return QorComplex32f{a.re * b.re - a.im * b.im, a.re * b.im + a.im * b.re};
                          }),
    binary<uint8_t>("mulScale 8u C1", 0, 0, qoriMulScale_8u_C1R, fractionProduct),
    binary<uint16_t>("mulScale 16u C1", 0, 0, qoriMulScale_16u_C1R, fractionProduct),
    binary<uint8_t>("div 8u C1 sfs 0", 0, 0, qoriDiv_8u_C1RSfs, quotient<uint8_t>, 0),
    binary<int16_t>("div 16s C1 sfs 0", 0, 0, qoriDiv_16s_C1RSfs, quotient<int16_t>, 0),
    binary<float>("div 32f C1", 3'324, 2'352, qoriDiv_32f_C1R, floatQuotient),
    binary<QorComplex16s>("div 16sc C1 sfs 0", 0, 0, qoriDiv_16sc_C1RSfs, complexQuotient, 0),
    binary<QorComplex32s>("div 32sc C1 sfs 0", 0, 0, qoriDiv_32sc_C1RSfs, wideQuotient, 0),
    binary<QorComplex32f>("div 32fc C1", 0, 0, qoriDiv_32fc_C1R, complexQuotient),
    constant<uint8_t>("addC 8u C1 sfs 0", 26'507, 14'076, qoriAddC_8u_C1RSfs, sum<uint8_t>, 0),
    constant<uint8_t, 3>("addC 8u C3 sfs 0", 8'590, 4'712, qoriAddC_8u_C3RSfs, sum<uint8_t>, 0),
    constant<int16_t, 3>("addC 16s C3 sfs 0", 0, 0, qoriAddC_16s_C3RSfs, sum<int16_t>, 0),
    constant<float>("addC 32f C1", 7'133, 3'514, qoriAddC_32f_C1R, [](float v, float a) { return a + v; }),
    constant<uint8_t>("subC 8u C1 sfs 0", 0, 0, qoriSubC_8u_C1RSfs, difference<uint8_t>, 0),
    constant<uint8_t>("mulC 8u C1 sfs 1", 0, 0, qoriMulC_8u_C1RSfs, scaledProduct<uint8_t, 1>, 1),
    constant<uint8_t, 3>("mulC 8u C3 sfs 0", 0, 0, qoriMulC_8u_C3RSfs, product<uint8_t>, 0),
    constant<uint8_t>("divC 8u C1 sfs 0", 0, 0, qoriDivC_8u_C1RSfs, quotient<uint8_t>, 0),
    constant<int16_t>("divC 16s C1 sfs 0", 0, 0, qoriDivC_16s_C1RSfs, quotient<int16_t>, 0),
    constant<float>("divC 32f C1", 0, 0, qoriDivC_32f_C1R, [](float v, float a) { return a / v; }),
    constant<uint8_t>("mulCScale 8u C1", 0, 0, qoriMulCScale_8u_C1R, fractionProduct),
}};

}  // namespace
}  // namespace qori::bench
