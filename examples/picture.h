// SPDX-License-Identifier: Apache-2.0
// A picture of 8-bit elements in memory from the library.
#pragma once
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "qori.h"

namespace demo {

/// Ends the demo on a status other than QOR_OK: panels pass valid images only.
void require(QorResult status);

/// Copies share the pixels. Pictures of one shape hand their memory on to each other, so that timings show the work and
/// not the first touch of fresh pages. Throws std::bad_alloc when the memory is not to be had.
class Picture {
public:
    Picture() = default;
    Picture(QorImageSize size, int channels);

    uint8_t* data() const { return pixels_.get(); }
    uint8_t* at(int x, int y) const { return data() + ptrdiff_t{step_} * y + x * channels_; }
    int32_t step() const { return step_; }
    QorImageSize size() const { return size_; }
    int width() const { return size_.width; }
    int height() const { return size_.height; }

private:
    std::shared_ptr<uint8_t> pixels_;
    QorImageSize size_{};
    int channels_ = 0;
    int32_t step_ = 0;
};

/// PNG, JPEG or binary PNM as three channels. Throws std::runtime_error with the reason when it cannot be read.
Picture readPicture(const std::string& file);
void writePng(const std::string& file, const Picture& picture);

/// Scaled to fit into the box, for showing only.
Picture thumbnail(const Picture& picture, QorImageSize box);

/// Text drawn in a typeface of the system; throws std::runtime_error without one.
class Typeface {
public:
    explicit Typeface(const std::string& file);
    ~Typeface();
    Typeface(const Typeface&) = delete;
    Typeface& operator=(const Typeface&) = delete;
    void draw(const Picture& target, int x, int baseline, float height, const std::string& text,
              const uint8_t (&colour)[3]) const;

private:
    struct Font;
    std::unique_ptr<Font> font_;
};

}  // namespace demo
