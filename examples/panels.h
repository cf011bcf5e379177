// SPDX-License-Identifier: Apache-2.0
// What the demo shows: one small function a panel, and a line in its family's list.
#pragma once
#include <span>

#include "picture.h"

namespace demo {

struct Panel {
    const char* caption;
    const char* functions;                  ///< The exports that do the work.
    Picture (*make)(const Picture& photo);  ///< Three channels, of the photograph's size.
    QorImageSize smallest = {1, 1};         ///< Photographs below this in a side leave nothing to show.
};

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
