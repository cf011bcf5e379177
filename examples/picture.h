// SPDX-License-Identifier: Apache-2.0
// A picture of 8-bit elements in memory from the library.
#pragma once
#include <cstdint>
#include <memory>
#include <string>

#include "qori.h"

namespace demo {

class Picture {
public:
    Picture() = default;
    /// Null pixels when the memory is not to be had.
    Picture(QorImageSize size, int channels) : size_(size), channels_(channels) {
        pixels_.reset(channels == 3 ? qoriMalloc_8u_C3(size.width, size.height, &step_)
                                    : qoriMalloc_8u_C1(size.width, size.height, &step_));
    }

    uint8_t* data() const { return pixels_.get(); }
    uint8_t* at(int x, int y) const { return data() + y * step_ + x * channels_; }
    int32_t step() const { return step_; }
    QorImageSize size() const { return size_; }
    int width() const { return size_.width; }
    int height() const { return size_.height; }

private:
    struct Free {
        void operator()(uint8_t* pixels) const { qoriFree(pixels); }
    };
    std::unique_ptr<uint8_t, Free> pixels_;
    QorImageSize size_{};
    int channels_ = 0;
    int32_t step_ = 0;
};

/// PNG, JPEG or PNM as three channels; without pixels, and with a reason, when it cannot be read.
Picture readPicture(const std::string& file, std::string& reason);
bool writePng(const std::string& file, const Picture& picture);

/// Scaled to fit into the box, for showing only.
Picture thumbnail(const Picture& picture, QorImageSize box);

/// Text drawn in a typeface of the system.
class Typeface {
public:
    explicit Typeface(const std::string& file);
    ~Typeface();
    Typeface(const Typeface&) = delete;
    Typeface& operator=(const Typeface&) = delete;
    bool isUsable() const { return font_ != nullptr; }
    void draw(const Picture& target, int x, int baseline, float height, const std::string& text,
              const uint8_t (&colour)[3]) const;

private:
    struct Font;
    std::unique_ptr<Font> font_;
};

}  // namespace demo
