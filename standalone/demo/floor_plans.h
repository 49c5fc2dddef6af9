// SPDX-License-Identifier: Apache-2.0
//
// The demo's floor plans, drawn by hand: 1200 by 800 pixels, SVG.
#pragma once

namespace lookhaven::demo {

constexpr char kGroundFloorPlan[] = R"(<?xml version="1.0" encoding="UTF-8"?>
<svg xmlns="http://www.w3.org/2000/svg" width="1200" height="800" viewBox="0 0 1200 800"
     font-family="system-ui, sans-serif">
  <rect width="1200" height="800" fill="#10171b"/>
  <rect x="100" y="100" width="640" height="600" fill="#182329"/>
  <rect x="100" y="100" width="240" height="180" fill="#1b2930"/>
  <rect x="100" y="460" width="240" height="240" fill="#1f2f37"/>
  <g stroke="#2b3d46" stroke-width="2">
    <path d="M120 620h200M120 636h200M120 652h200M120 668h200M120 684h200"/>
  </g>
  <g fill="none" stroke="#9fb4bf" stroke-width="8" stroke-linecap="square">
    <path d="M380 700H100V100H740V120M740 200V700H460"/>
    <path d="M100 280H250M320 280H340V100"/>
    <path d="M100 460H240M310 460H340V700"/>
    <path d="M340 340H520"/>
  </g>
  <g fill="none" stroke="#62757f" stroke-width="2">
    <path d="M380 700a80 80 0 0 1 80 -80v80"/>
    <path d="M740 120a80 80 0 0 0 -80 80h80"/>
    <path d="M250 280a70 70 0 0 0 70 70v-70"/>
    <path d="M240 460a70 70 0 0 1 70 -70v70"/>
  </g>
  <g fill="#263840" stroke="#4a5f6a" stroke-width="2">
    <rect x="490" y="400" width="170" height="60" rx="6"/>
    <rect x="400" y="140" width="200" height="40" rx="4"/>
    <rect x="400" y="220" width="200" height="40" rx="4"/>
    <rect x="140" y="130" width="60" height="40" rx="4"/>
    <circle cx="660" cy="560" r="38"/>
    <circle cx="660" cy="640" r="24"/>
  </g>
  <g stroke="#3a4d57" stroke-width="3" fill="none">
    <path d="M840 130v160M920 130v160M1000 130v160M1080 130v160M840 510v160M920 510v160M1000 510v160M1080 510v160"/>
    <path d="M780 400h360" stroke-dasharray="24 20"/>
  </g>
  <g fill="#6f858f" font-size="20" text-anchor="middle" letter-spacing="2">
    <text x="225" y="255">PLANT</text>
    <text x="570" y="320">STORE</text>
    <text x="570" y="520">SHOP</text>
    <text x="220" y="520">STAIRS</text>
    <text x="960" y="370">PARKING</text>
  </g>
</svg>
)";

constexpr char kUpperFloorPlan[] = R"(<?xml version="1.0" encoding="UTF-8"?>
<svg xmlns="http://www.w3.org/2000/svg" width="1200" height="800" viewBox="0 0 1200 800"
     font-family="system-ui, sans-serif">
  <rect width="1200" height="800" fill="#10171b"/>
  <rect x="100" y="100" width="640" height="600" fill="#182329"/>
  <rect x="740" y="340" width="300" height="360" fill="#151f24"/>
  <rect x="100" y="460" width="240" height="240" fill="#1f2f37"/>
  <g stroke="#2b3d46" stroke-width="2">
    <path d="M120 620h200M120 636h200M120 652h200M120 668h200M120 684h200"/>
    <path d="M760 360h260M760 400h260M760 440h260M760 480h260M760 520h260M760 560h260M760 600h260M760 640h260M760 680h260"/>
  </g>
  <g fill="none" stroke="#9fb4bf" stroke-width="8" stroke-linecap="square">
    <path d="M740 480V100H100V700H740V580"/>
    <path d="M100 460H240M310 460H340V700"/>
    <path d="M420 100V200M420 280V340H740"/>
  </g>
  <path d="M740 340h300v360H740" fill="none" stroke="#62757f" stroke-width="4"/>
  <g fill="none" stroke="#62757f" stroke-width="2">
    <path d="M240 460a70 70 0 0 1 70 -70v70"/>
    <path d="M420 200a80 80 0 0 1 -80 80h80"/>
    <path d="M740 480a100 100 0 0 0 -100 100h100"/>
  </g>
  <g fill="#263840" stroke="#4a5f6a" stroke-width="2">
    <rect x="470" y="230" width="230" height="30" rx="4"/>
    <rect x="470" y="290" width="230" height="30" rx="4"/>
    <rect x="140" y="140" width="110" height="60" rx="6"/>
    <rect x="140" y="260" width="110" height="60" rx="6"/>
    <rect x="450" y="440" width="150" height="120" rx="50"/>
  </g>
  <g fill="#6f858f" font-size="20" text-anchor="middle" letter-spacing="2">
    <text x="310" y="160">OFFICE</text>
    <text x="590" y="150">WAREHOUSE</text>
    <text x="525" y="620">MEETING</text>
    <text x="220" y="520">STAIRS</text>
    <text x="890" y="545">TERRACE</text>
  </g>
</svg>
)";

}  // namespace lookhaven::demo
