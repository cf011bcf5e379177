// SPDX-License-Identifier: Apache-2.0
#include "picture.h"

#include <algorithm>
#include <cmath>
#include <fstream>
#include <iterator>
#include <vector>

#define STB_IMAGE_IMPLEMENTATION
#define STBI_ONLY_PNG
#define STBI_ONLY_JPEG
#define STBI_ONLY_PNM
#define STB_IMAGE_WRITE_IMPLEMENTATION
#define STB_IMAGE_RESIZE_IMPLEMENTATION
#define STB_TRUETYPE_IMPLEMENTATION
#include <stb_image.h>
#include <stb_image_resize.h>
#include <stb_image_write.h>
#include <stb_truetype.h>

namespace demo {

Picture readPicture(const std::string& file, std::string& reason) {
    int width = 0, height = 0, channels = 0;
    const std::unique_ptr<stbi_uc, void (*)(void*)> pixels(stbi_load(file.c_str(), &width, &height, &channels, 3),
                                                           stbi_image_free);
    if (!pixels) {
        reason = stbi_failure_reason();
        return {};
    }
    Picture picture({width, height}, 3);
    if (picture.data() == nullptr) {
        reason = "out of memory";
        return {};
    }
    qoriCopy_8u_C3R(pixels.get(), 3 * width, picture.data(), picture.step(), picture.size());
    return picture;
}

bool writePng(const std::string& file, const Picture& picture) {
    return stbi_write_png(file.c_str(), picture.width(), picture.height(), 3, picture.data(), picture.step()) != 0;
}

Picture thumbnail(const Picture& picture, QorImageSize box) {
    const double scale = std::min(double(box.width) / picture.width(), double(box.height) / picture.height());
    const QorImageSize size{std::max(1, int(std::lround(picture.width() * scale))),
                            std::max(1, int(std::lround(picture.height() * scale)))};
    Picture small(size, 3);
    if (small.data() != nullptr)
        stbir_resize_uint8_srgb(picture.data(), picture.width(), picture.height(), picture.step(), small.data(),
                                size.width, size.height, small.step(), 3, STBIR_ALPHA_CHANNEL_NONE, 0);
    return small;
}

struct Typeface::Font {
    std::vector<unsigned char> file;
    stbtt_fontinfo info{};
};

Typeface::Typeface(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    auto font = std::make_unique<Font>();
    font->file.assign(std::istreambuf_iterator<char>(in), {});
    if (!font->file.empty() && stbtt_InitFont(&font->info, font->file.data(), 0)) font_ = std::move(font);
}

Typeface::~Typeface() = default;

void Typeface::draw(const Picture& target, int x, int baseline, float height, const std::string& text,
                    const uint8_t (&colour)[3]) const {
    const float scale = stbtt_ScaleForPixelHeight(&font_->info, height);
    float pen = static_cast<float>(x);
    for (size_t i = 0; i < text.size(); ++i) {
        int advance = 0, bearing = 0, w = 0, h = 0, dx = 0, dy = 0;
        stbtt_GetCodepointHMetrics(&font_->info, text[i], &advance, &bearing);
        unsigned char* glyph = stbtt_GetCodepointBitmap(&font_->info, scale, scale, text[i], &w, &h, &dx, &dy);
        for (int gy = 0; gy < h; ++gy)
            for (int gx = 0; gx < w; ++gx) {
                const int px = static_cast<int>(pen) + dx + gx, py = baseline + dy + gy, cover = glyph[gy * w + gx];
                if (px < 0 || py < 0 || px >= target.width() || py >= target.height()) continue;
                uint8_t* pixel = target.at(px, py);
                for (int c = 0; c < 3; ++c)
                    pixel[c] = static_cast<uint8_t>((pixel[c] * (255 - cover) + colour[c] * cover) / 255);
            }
        stbtt_FreeBitmap(glyph, nullptr);
        pen += scale * static_cast<float>(advance);
        if (i + 1 < text.size())
            pen += scale * static_cast<float>(stbtt_GetCodepointKernAdvance(&font_->info, text[i], text[i + 1]));
    }
}

}  // namespace demo
