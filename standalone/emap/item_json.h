// SPDX-License-Identifier: Apache-2.0
//
// Items of e-maps as editors and exported maps have them: objects with the names that the live view's answer uses too.
#pragma once

#include <vector>

#include <json/json.h>

#include "standalone/store/emaps.h"

namespace lookhaven::emap {

Json::Value ToJson(const std::vector<store::EmapItem>& items);

// Members that are missing have the record's defaults. Throws store::InvalidRecord for anything but a list of objects
// with whole numbers and a text; the numbers' bounds are the store's business.
std::vector<store::EmapItem> ItemsFromJson(const Json::Value& list);

}  // namespace lookhaven::emap
