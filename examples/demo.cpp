// SPDX-License-Identifier: Apache-2.0
// Runs a photograph through the library and writes a contact sheet.
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <exception>
#include <new>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

constexpr int kColumns = 3, kGap = 24, kCaption = 58, kHeader = 92;
constexpr QorImageSize kCell{560, 400};
constexpr uint8_t kBackground[3] = {24, 26, 31}, kBright[3] = {238, 238, 232}, kDim[3] = {150, 156, 166};

struct Result {
    Picture picture;
    double milliseconds;
};

/// The quickest of some runs. The first ones also fetch memory and fill the caches.
Result timed(const Panel& panel, const Picture& photo) {
    Result best{{}, 1e9};
    for (int run = 0; run < 7; ++run) {
        const auto begin = std::chrono::steady_clock::now();
        Picture picture = panel.make(photo);
        const std::chrono::duration<double, std::milli> taken = std::chrono::steady_clock::now() - begin;
        best.milliseconds = std::min(best.milliseconds, taken.count());
        best.picture = std::move(picture);
    }
    return best;
}

void place(const Picture& sheet, const Typeface& type, const Panel& panel, const Result& result, int cell,
           int64_t pixels) {
    const int x = kGap + cell % kColumns * (kCell.width + kGap),
              y = kHeader + cell / kColumns * (kCell.height + kCaption + kGap);
    const Picture small = thumbnail(result.picture, kCell);
    require(qoriCopy_8u_C3R(small.data(), small.step(),
                            sheet.at(x + (kCell.width - small.width()) / 2, y + (kCell.height - small.height()) / 2),
                            sheet.step(), small.size()));
    char text[160];
    std::snprintf(text, sizeof text, "%s   %.3f ms, %.0f Mpix/s", panel.functions, result.milliseconds,
                  static_cast<double>(pixels) / result.milliseconds * 1e-3);
    type.draw(sheet, x, y + kCell.height + 24, 22, panel.caption, kBright);
    type.draw(sheet, x, y + kCell.height + 48, 18, text, kDim);
    std::printf("%-30s %s\n", panel.caption, text);
}

void run(const char* photoFile, const char* sheetFile, const char* fontFile) {
    const Picture photo = readPicture(photoFile);
    const Typeface type(fontFile);
    std::vector<Panel> panels;
    for (const auto& family : {copyPanels(), borderPanels(), arithPanels(), statsPanels(), filterPanels(), resizePanels()})
        panels.insert(panels.end(), family.begin(), family.end());

    const int rows = (static_cast<int>(panels.size()) + kColumns - 1) / kColumns;
    const Picture sheet({kGap + kColumns * (kCell.width + kGap), kHeader + rows * (kCell.height + kCaption + kGap)}, 3);
    require(qoriSet_8u_C3R(kBackground, sheet.data(), sheet.step(), sheet.size()));
    char title[160];
    const QorLibraryVersion* version = qoriGetLibVersion();
    std::snprintf(title, sizeof title, "%s %s, %d-bit:  %d x %d pixels, quickest of 7 runs", version->libraryName,
                  version->versionText, static_cast<int>(8 * sizeof(void*)), photo.width(), photo.height());
    type.draw(sheet, kGap, 56, 30, title, kBright);
    for (size_t i = 0; i < panels.size(); ++i)
        place(sheet, type, panels[i], timed(panels[i], photo), static_cast<int>(i),
              int64_t{photo.width()} * photo.height());
    writePng(sheetFile, sheet);
}

}  // namespace
}  // namespace demo

int main(int argc, char** argv) {
    if (argc != 4) {
        std::fprintf(stderr, "usage: demo PICTURE SHEET.png TYPEFACE.ttf\n");
        return 2;
    }
    try {
        demo::run(argv[1], argv[2], argv[3]);
        return 0;
    } catch (const std::bad_alloc&) {
        std::fprintf(stderr, "demo: out of memory\n");
    } catch (const std::exception& error) {
        std::fprintf(stderr, "demo: %s\n", error.what());
    }
    return 1;
}
