// SPDX-License-Identifier: Apache-2.0
//
// How much the processes of the installation log of what they do: thresholds that hold at once, and over restarts.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <set>

#include <json/json.h>
#include <sys/types.h>

#include "standalone/admin/actor.h"
#include "standalone/base/installation.h"
#include "standalone/base/names.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

const base::Names<int>& LogLevels();
// The categories that have a name; each of the 512 has a number.
const base::Names<int>& LogCategories();

// The level of most categories, which are unused; and those that have a name, or another level than most.
int CommonLevel(const control::DebugLogConfig& config);
std::set<int> ListedCategories(const control::DebugLogConfig& config);

// {"category": [{"name", "level"}], "others": level, "process": [{"pid", "level"}], "revision"}. Levels are words of
// LogLevels. category: the listed ones, those without a name by their number. others: the level of most. The revision
// stands for categories and others.
Json::Value LogRecord(const base::Installation& installation);

// What is missing stays.
struct LogChange {
    std::optional<int> every = {};        // of all categories, before the next two
    std::optional<int> others = {};       // of those that LogRecord does not list
    std::map<int, int> categories = {};   // by number
    std::map<pid_t, int> processes = {};  // 0: what the categories say; for the command line, for ids are used again
};

// Returns the record as it is then. seen: the revision that the actor saw; nothing for whatever it is. Throws Stale;
// Forbidden; store::InvalidRecord for another category, level or a process that does not run; store::StoreError,
// after which they may have changed all the same; std::system_error where the thresholds cannot be written.
Json::Value SetLogLevels(store::Store& store, const base::Installation& installation, const Actor& actor,
                         std::optional<std::int64_t> seen, const LogChange& change);

}  // namespace lookhaven::admin
