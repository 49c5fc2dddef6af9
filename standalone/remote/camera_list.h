// SPDX-License-Identifier: Apache-2.0
//
// The list of its cameras that a host gives to one that it is paired with.
#pragma once

#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/store/servers.h"

namespace lookhaven::remote {

// Of an array of {"id", "name", "video", "audio"}; server_id is 0. Throws Json::Exception for a member of the wrong
// type.
std::vector<store::RemoteCamera> CamerasIn(const Json::Value& list);

// The cameras in what a host's VEXO.Pairing answers to Cameras. Throws NoAnswer for any other text.
std::vector<store::RemoteCamera> CamerasInAnswer(const std::string& text);

}  // namespace lookhaven::remote
