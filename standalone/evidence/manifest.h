// SPDX-License-Identifier: Apache-2.0
//
// The list that an export carries: cameras, times, gaps and the hash of each file.
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include <json/json.h>

#include "standalone/evidence/plan.h"

namespace lookhaven::evidence {

constexpr const char* kManifestName = "manifest.json";
constexpr const char* kManifestFormat = "lookhaven export 1";

// hashes: SHA-256 of the plan's files in their order. The text has the same length whatever they are.
std::string ManifestOf(const Plan& plan, std::span<const std::string> hashes);

// What the plan says of cameras, files and gaps, without hashes.
Json::Value CamerasOf(const Plan& plan);

// "2026-03-01T09:15:30.000+01:00".
std::string LocalTime(std::int64_t wall_ms, int utc_offset_min);

}  // namespace lookhaven::evidence
