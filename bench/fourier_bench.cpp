// SPDX-License-Identifier: Apache-2.0
// Two-dimensional Fourier transforms; plans and buffers are made outside the timing. The peer lays real spectra out as
// half a complex image, one column wider than ours.
#include <cmath>

#include "bench.h"

#ifdef QORI_BENCH_FFTW
#include <fftw3.h>
#endif

namespace qori::bench {
namespace {

enum class Kind { forward, inverse, complex };

#ifdef QORI_BENCH_FFTW
/// One thread, single precision, measured.
std::function<void()> peerOf(Kind kind, Size size) {
    const int half = size.width / 2 + 1, columns = kind == Kind::complex ? size.width : half;
    const Block spectrum = allocate(size_t{8} * static_cast<size_t>(columns) * static_cast<size_t>(size.height));
    const Block image = allocate(size_t{8} * static_cast<size_t>(size.pixels()));
    auto* const wave = reinterpret_cast<fftwf_complex*>(spectrum.get());
    auto* const real = reinterpret_cast<float*>(image.get());
    auto* const other = reinterpret_cast<fftwf_complex*>(image.get());
    const unsigned flags = FFTW_MEASURE;
    fftwf_plan plan = kind == Kind::forward   ? fftwf_plan_dft_r2c_2d(size.height, size.width, real, wave, flags)
                      : kind == Kind::inverse ? fftwf_plan_dft_c2r_2d(size.height, size.width, wave, real, flags)
                                              : fftwf_plan_dft_2d(size.height, size.width, other, wave, -1, flags);
    for (int64_t i = 0; i < size.pixels() * (kind == Kind::complex ? 2 : 1); ++i)
        real[i] = static_cast<float>(i * 97 % 256);
    for (int64_t i = 0; i < int64_t{2} * columns * size.height; ++i)
        reinterpret_cast<float*>(wave)[i] = static_cast<float>(i * 97 % 256);
    const std::shared_ptr<fftwf_plan_s> kept(plan, fftwf_destroy_plan);
    return [=] {
        keep(spectrum.get());
        keep(image.get());
        fftwf_execute(kept.get());
    };
}
#endif

/// The real transform of so many channels.
auto realTransform(Kind kind, int channels) {
    const bool isForward = kind == Kind::forward;
    switch (channels) {
        case 3: return isForward ? qoriDFTFwd_RToPack_32f_C3R : qoriDFTInv_PackToR_32f_C3R;
        case 4: return isForward ? qoriDFTFwd_RToPack_32f_C4R : qoriDFTInv_PackToR_32f_C4R;
        default: return isForward ? qoriDFTFwd_RToPack_32f_C1R : qoriDFTInv_PackToR_32f_C1R;
    }
}

/// A plan, its buffer and the call.
std::function<void()> jobOf(Kind kind, Size size, int channels = 1) {
    int32_t planBytes = 0, initBytes = 0, bufferBytes = 0;
    const auto sizes = kind == Kind::complex ? qoriDFTGetSize_C_32fc : qoriDFTGetSize_R_32f;
    const auto prepare = kind == Kind::complex ? qoriDFTInit_C_32fc : qoriDFTInit_R_32f;
    must(sizes(size.roi(), fftNoDiv, hintFast, &planBytes, &initBytes, &bufferBytes));
    const Block block = allocate(static_cast<size_t>(planBytes)), buffer = allocate(static_cast<size_t>(bufferBytes));
    const Block init = allocate(static_cast<size_t>(initBytes) + 1);
    must(prepare(size.roi(), fftNoDiv, hintFast, reinterpret_cast<QorFft2DPlan*>(block.get()), init.get()));
    const int parts = kind == Kind::complex ? 2 : channels;
    const Image<float> src(size, parts), dst(size, parts);
    return [=] {
        const auto* const plan = reinterpret_cast<const QorFft2DPlan*>(block.get());
        if (kind == Kind::complex)
            must(qoriDFTFwd_CToC_32fc_C1R(reinterpret_cast<const QorComplex32f*>(src.data()), src.step(),
                                          reinterpret_cast<QorComplex32f*>(dst.data()), dst.step(), plan,
                                          buffer.get()));
        else
            must(realTransform(kind, channels)(src.data(), src.step(), dst.data(), dst.step(), plan, buffer.get()));
    };
}

Row row(Kind kind, Size size, double best = 0) {
    const char* const names[] = {"FFT 2D 32f real forward", "FFT 2D 32f real inverse", "FFT 2D 32f complex forward"};
    const auto make = [=](Size) {
        Contenders all{jobOf(kind, size), {}, {}};
#ifdef QORI_BENCH_FFTW
        all.peer = peerOf(kind, size);
#endif
        return all;
    };
    return {.operation = names[static_cast<int>(kind)],
            .bytesPerPixel = kind == Kind::complex ? 16.0 : 8.0,
            .sizes = {size},
            .make = make,
            .peerName = "FFTW",
            .best = best};
}

/// Several channels beside as many planes of one.
Row channelRow(Kind kind, Size size, int channels) {
    const auto make = [=](Size) {
        std::vector<std::function<void()>> planes;
        for (int c = 0; c < channels; ++c) planes.push_back(jobOf(kind, size));
        const auto all = [=] {
            for (const auto& plane : planes) plane();
        };
        return Contenders{jobOf(kind, size, channels), {}, all};
    };
    const std::string direction = kind == Kind::forward ? " real forward" : " real inverse";
    return {.operation = "FFT 2D 32f C" + std::to_string(channels) + direction,
            .bytesPerPixel = 8.0 * channels,
            .sizes = {size},
            .make = make,
            .peerName = "planes"};
}

const Rows forward{{row(Kind::forward, {64, 64}), row(Kind::forward, {128, 128}), row(Kind::forward, {256, 256}, 802),
                    row(Kind::forward, {512, 512}, 693), row(Kind::forward, {1024, 1024}, 474),
                    row(Kind::forward, {2048, 2048}, 359), row(Kind::forward, {4096, 4096}, 201)}};
const Rows inverse{{row(Kind::inverse, {64, 64}), row(Kind::inverse, {256, 256}), row(Kind::inverse, {512, 512}, 736),
                    row(Kind::inverse, {2048, 2048}, 347), row(Kind::inverse, {4096, 4096})}};
const Rows complex{{row(Kind::complex, {64, 64}), row(Kind::complex, {256, 256}, 554),
                    row(Kind::complex, {512, 512}, 275), row(Kind::complex, {1024, 1024}, 233),
                    row(Kind::complex, {2048, 2048}, 192), row(Kind::complex, {4096, 4096}, 107)}};
const Rows anySize{{row(Kind::forward, {640, 360}), row(Kind::forward, {1920, 1080}), row(Kind::forward, {1000, 1000}),
                    row(Kind::forward, {509, 509}), row(Kind::complex, {1000, 1000}), row(Kind::complex, {509, 509})}};
const Rows severalChannels{{channelRow(Kind::forward, {64, 64}, 3), channelRow(Kind::inverse, {64, 64}, 3),
                            channelRow(Kind::forward, {64, 64}, 4), channelRow(Kind::inverse, {64, 64}, 4),
                            channelRow(Kind::forward, {512, 512}, 3), channelRow(Kind::inverse, {512, 512}, 3),
                            channelRow(Kind::forward, {512, 512}, 4), channelRow(Kind::inverse, {512, 512}, 4),
                            channelRow(Kind::forward, {1000, 1000}, 3)}};

/// Squares whose work is n log n.
std::vector<Step> squares(const std::vector<int>& sides) {
    std::vector<Step> steps;
    for (int n : sides) {
        const double points = static_cast<double>(n) * n;
        steps.push_back(
            {std::to_string(n) + "x" + std::to_string(n), points * std::log2(points), jobOf(Kind::forward, {n, n})});
    }
    return steps;
}

const Ladders ladders{{
    {.operation = "DFT 32f forward, sides by factors",
     .make =
         [] {
             return squares({64,  67,  70,  81,  83,   96,   101,  107,  113,  121,  127,  128, 131, 144, 167,
                             169, 179, 180, 191, 193,  199,  200,  211,  227,  243,  251,  256, 257, 263, 289,
                             293, 300, 331, 343, 361,  384,  409,  500,  509,  512,  521,  529, 600, 625, 720,
                             841, 900, 961, 997, 1000, 1009, 1024, 1050, 2039, 2048, 4093, 4096});
         },
     .reason = "primes are convolved, with parts of about twice their length where p - 1 has large factors"},
}};

}  // namespace
}  // namespace qori::bench
