// SPDX-License-Identifier: Apache-2.0
//
// Which kinds of events a call asks for: recordings by their reason, and marks.
#pragma once

#include <optional>
#include <string>

#include <json/json.h>

#include "standalone/store/events.h"
#include "standalone/store/marks.h"

namespace lookhaven::api {

struct EventKinds {
    bool continuous = true;
    bool alarm = true;
    bool alert = true;
    bool pos = true;

    // asked: names of kinds, separated by commas; null: all. Throws Failure 400 for any other name.
    explicit EventKinds(const Json::Value& asked);

    // The reasons of the recordings asked for; only when any are.
    store::Reasons Reasons() const;
    // The only kind of marks asked for, nothing for both; only when any are.
    std::optional<store::MarkKind> OnlyMark() const;

  private:
    void Choose(const std::string& name);
};

}  // namespace lookhaven::api
