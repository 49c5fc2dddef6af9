// SPDX-License-Identifier: Apache-2.0
//
// Turns the store's events into the platform's records.
#pragma once

#include <string>

#include "platform/recording/event.h"
#include "standalone/store/events.h"

namespace lookhaven::binding {

Event PlatformEvent(const store::Event& event, const std::string& mount_path);

}  // namespace lookhaven::binding
