// SPDX-License-Identifier: Apache-2.0
// Threads share one plan of a transform, each with images and a work buffer of its own, or with a buffer that the call
// allocates. The spectra are those of one thread; built for it, the thread sanitizer watches.
#include <atomic>
#include <cstdio>
#include <thread>
#include <vector>

#include "qori.h"

namespace {

constexpr int kThreads = 4, kRounds = 6;

/// Powers of two, mixed factors, a chirp.
constexpr QorImageSize kSizes[] = {{64, 32}, {60, 42}, {127, 101}};

using Floats = std::vector<float>;

bool transform(const QorFft2DPlan* plan, QorImageSize size, const Floats& image, uint8_t* buffer, Floats& spectrum,
               Floats& back) {
    const int32_t step = size.width * static_cast<int32_t>(sizeof(float));
    return qoriDFTFwd_RToPack_32f_C1R(image.data(), step, spectrum.data(), step, plan, buffer) == QOR_OK &&
           qoriDFTInv_PackToR_32f_C1R(spectrum.data(), step, back.data(), step, plan, buffer) == QOR_OK;
}

bool agrees(QorImageSize size) {
    int32_t planBytes, initBytes, bufferBytes;
    if (qoriDFTGetSize_R_32f(size, fftDivInvByN, hintFast, &planBytes, &initBytes, &bufferBytes) != QOR_OK)
        return false;
    std::vector<uint8_t> memory(static_cast<size_t>(planBytes)), init(static_cast<size_t>(initBytes) + 1);
    auto* plan = reinterpret_cast<QorFft2DPlan*>(memory.data());
    if (qoriDFTInit_R_32f(size, fftDivInvByN, hintFast, plan, init.data()) != QOR_OK) return false;
    Floats image(static_cast<size_t>(size.width) * static_cast<size_t>(size.height));
    for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<float>(i * 7919 % 256);
    Floats spectrum = image, back = image;
    if (!transform(plan, size, image, nullptr, spectrum, back)) return false;

    std::atomic<bool> succeeded{true};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            std::vector<uint8_t> buffer(static_cast<size_t>(bufferBytes));
            for (int round = 0; round < kRounds; ++round) {
                Floats mine = image, mineBack = image;
                uint8_t* const given = (t + round) % 2 == 0 ? buffer.data() : nullptr;
                if (!transform(plan, size, image, given, mine, mineBack) || mine != spectrum || mineBack != back)
                    succeeded = false;
            }
        });
    for (std::thread& thread : threads) thread.join();
    return succeeded;
}

}  // namespace

int main() {
    int failures = 0;
    for (const QorImageSize size : kSizes)
        if (!agrees(size)) {
            std::printf("%dx%d: spectra made in threads differ from those of one\n", size.width, size.height);
            ++failures;
        }
    return failures == 0 ? 0 : 1;
}
