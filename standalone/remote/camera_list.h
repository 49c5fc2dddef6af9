// SPDX-License-Identifier: Apache-2.0
//
// The list of its cameras that a host gives to one that it is paired with.
#pragma once

#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/store/servers.h"

namespace lookhaven::remote {

// Reads an array of {"id", "name", "video", "audio"}; server_id is 0. Throws Json::Exception for a member of the
// wrong type.
std::vector<store::RemoteCamera> CamerasIn(const Json::Value& list);

// The data of what a host's VEXO.Pairing answers, whose member "camera" is such a list. Throws NoAnswer for any other
// text.
Json::Value DataInAnswer(const std::string& text);

// The cameras in it. Throws NoAnswer.
std::vector<store::RemoteCamera> CamerasInAnswer(const std::string& text);

}  // namespace lookhaven::remote
