// SPDX-License-Identifier: Apache-2.0
//
// Finds the file of an event's recording.
#pragma once

#include <string>

// Each returns an empty name when there is no such event (after a log line) or nothing of it is saved (without one).
std::string GetRecordedFilename(int mountId, int eventId);
std::string GetAlertEventFilename(int eventId);
std::string GetPosEventFilename(int eventId);
