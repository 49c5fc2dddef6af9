// SPDX-License-Identifier: Apache-2.0
//
// The manifest of an export: cameras, times, gaps and the hash of each file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/evidence/plan.h"

namespace lookhaven::evidence {

constexpr const char* kManifestName = "manifest.json";
// Beside it: its signature, 64 bytes, and the public key to check that with, in PEM format.
constexpr const char* kSignatureName = "manifest.json.sig";
constexpr const char* kPublicKeyName = "manifest.json.pub";
constexpr const char* kManifestFormat = "lookhaven export 1";

// More of them in one file are told as fewer and longer ones.
constexpr std::ptrdiff_t kMaxMissingSpans = 4;

struct WrittenFile {
    std::string sha256 = {};
    // What the plan promised and could no longer be read: at most kMaxMissingSpans, and no more than the file has
    // parts.
    std::vector<archive::TimeSpan> missing = {};
};

// written: the plan's files in their order. The text has ManifestBytes whatever became of them.
std::string ManifestOf(const Plan& plan, std::span<const WrittenFile> written);
std::int64_t ManifestBytes(const Plan& plan);

// What the plan says of cameras, files and gaps, without hashes.
Json::Value CamerasOf(const Plan& plan);

// "2026-03-01T09:15:30.000+01:00".
std::string LocalTime(std::int64_t wall_ms, int utc_offset_min);

}  // namespace lookhaven::evidence
