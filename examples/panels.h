// SPDX-License-Identifier: Apache-2.0
// What the demo shows: one small function a panel, and a line in its family's list.
#pragma once
#include <array>
#include <span>

#include "picture.h"
#include "recipe_values.h"

namespace demo {

/// Its caption and every value in it come from its recipe in docs/recipes/panels, which makes it in Python too.
struct Panel {
    recipes::About about;
    Picture (*make)(const Picture& photo);  ///< Three channels, of the photograph's size.
    QorImageSize smallest = {1, 1};         ///< Photographs below this in a side leave nothing to show.
};

/// Values of a recipe as elements of a picture.
template <size_t n>
constexpr std::array<uint8_t, n> bytes(const std::array<int, n>& values) {
    std::array<uint8_t, n> elements{};
    for (size_t i = 0; i < n; ++i) elements[i] = static_cast<uint8_t>(values[i]);
    return elements;
}

std::span<const Panel> copyPanels();
std::span<const Panel> arithPanels();
std::span<const Panel> borderPanels();
std::span<const Panel> filterPanels();
std::span<const Panel> fourierPanels();
std::span<const Panel> morphologyPanels();
std::span<const Panel> medianPanels();
std::span<const Panel> resizePanels();
std::span<const Panel> statsPanels();
std::span<const Panel> tablePanels();
std::span<const Panel> thresholdPanels();
std::span<const Panel> dctPanels();
std::span<const Panel> matchingPanels();
std::span<const Panel> featuresPanels();
std::span<const Panel> warpPanels();

}  // namespace demo
