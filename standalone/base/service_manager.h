// SPDX-License-Identifier: Apache-2.0
//
// Tells the service manager how this process is, by systemd's protocol. Nothing happens where there is none, as under
// script/server.
//
// Why so        The library that does it brings others along, and each one that the host loads makes its forks slower.
#pragma once

#include <chrono>

namespace lookhaven::base {

// The process does its work from now on; services that need it may start.
void TellReady();

// The process ends; what it still does is no failure.
void TellStopping();

// The process is alive. The service manager restarts one that has not said so for twice AliveInterval().
void TellAlive();

// How often TellAlive is expected at the least; an hour where nobody expects it.
std::chrono::milliseconds AliveInterval();

}  // namespace lookhaven::base
