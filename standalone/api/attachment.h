// SPDX-License-Identifier: Apache-2.0
//
// What the answers that are files to keep have in common.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "standalone/api/call.h"
#include "standalone/archive/recording_part.h"

namespace lookhaven::api {

// The client's zone in minutes east of UTC; 0 when the parameter "utc_offset_min" is missing. Throws Failure 400.
int UtcOffset(const Call& call);

// Says in the log that the caller, who has a login, is sent footage: "an export", of "camera 1, 2".
void LogFootageSent(const Call& call, const std::string& what, const std::string& cameras,
                    const archive::TimeSpan& span);

// Runs what writes to standard output. That the client has left is no failure; throws whatever else send does.
void SendUntilClientLeaves(const std::function<void()>& send);

// Writes the head of an answer of that size to standard output. name: the file's, in UTF-8.
void SendAttachmentHead(const std::string& content_type, const std::string& name, std::int64_t size_bytes);

}  // namespace lookhaven::api
