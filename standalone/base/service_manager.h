// SPDX-License-Identifier: Apache-2.0
//
// Notifies the service manager of this process's state, by systemd's protocol. Nothing happens where there is none, as
// under script/server.
//
// Why so        The library that does it brings others along, and each one that the host loads makes its forks slower.
#pragma once

#include <chrono>

namespace lookhaven::base {

// The process does its work from now on; services that need it may start.
void NotifyReady();

// The process ends; what it still does is no failure.
void NotifyStopping();

// The process is alive. The service manager restarts one that has not said so for twice AliveInterval().
void NotifyAlive();

// How often NotifyAlive is expected at the least; an hour where nobody expects it.
std::chrono::milliseconds AliveInterval();

}  // namespace lookhaven::base
