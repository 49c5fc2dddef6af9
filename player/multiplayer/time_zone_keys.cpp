// SPDX-License-Identifier: Apache-2.0
#include "player/multiplayer/time_zone_keys.h"

const std::array<std::string, 43> kTimeZoneKeys = {
    "utc_n720", "utc_n660", "utc_n600", "utc_n570", "utc_n540", "utc_n510", "utc_n480", "utc_n420", "utc_n360",
    "utc_n300", "utc_n270", "utc_n240", "utc_n210", "utc_n180", "utc_n150", "utc_n120", "utc_n60",  "utc_0",
    "utc_60",   "utc_120",  "utc_180",  "utc_210",  "utc_240",  "utc_270",  "utc_300",  "utc_330",  "utc_345",
    "utc_360",  "utc_390",  "utc_420",  "utc_480",  "utc_510",  "utc_525",  "utc_540",  "utc_570",  "utc_600",
    "utc_630",  "utc_660",  "utc_720",  "utc_765",  "utc_780",  "utc_825",  "utc_840",
};
