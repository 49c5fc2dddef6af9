// SPDX-License-Identifier: Apache-2.0
//
// A player that keeps to the protocol of players (flags, player file, progress file) and sends what it knows as text
// instead of pictures.
#pragma once

#include "platform/webapi/apirequest.h"

// Sends parts of the form "rate=1 paused=0 checks=0 sum=0" every few milliseconds until it is told to stop. checks: how
// often it was asked to look at its player file; sum: how far it has gone. "opens": milliseconds that opening takes.
void PlayTest(const VEXO::APIRequest& request);
