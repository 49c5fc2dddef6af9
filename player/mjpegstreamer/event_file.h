// SPDX-License-Identifier: Apache-2.0
//
// The file that holds an event's recording.
#pragma once

#include <string>

// Each returns an empty name when there is no such event, after a log line, or when nothing of it is saved.
std::string GetRecordedFilename(int mountId, int eventId);
std::string GetAlertEventFilename(int eventId);
std::string GetPosEventFilename(int eventId);
