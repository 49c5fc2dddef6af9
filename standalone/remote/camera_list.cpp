// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/camera_list.h"

#include <memory>

#include "standalone/remote/fetch.h"

namespace lookhaven::remote {

namespace {

constexpr const char* kNotUnderstood = "an answer that cannot be understood";

// Throws Json::Exception for what is nested too deeply.
Json::Value Parse(const std::string& text) {
    Json::CharReaderBuilder builder;
    builder["stackLimit"] = 8;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string ignored;
    return reader->parse(text.data(), text.data() + text.size(), &value, &ignored) ? value : Json::Value();
}

}  // namespace

std::vector<store::RemoteCamera> CamerasIn(const Json::Value& list) {
    std::vector<store::RemoteCamera> cameras;
    for (const Json::Value& camera : list) {
        cameras.push_back({.id_on_server = camera["id"].asInt(),
                           .name = camera["name"].asString(),
                           .video_type = static_cast<base::Codec>(camera["video"].asInt()),
                           .audio = camera["audio"].asBool()});
    }
    return cameras;
}

Json::Value DataInAnswer(const std::string& text) try {
    const Json::Value json = Parse(text);
    if (json.isObject() && json["data"].isObject() && json["data"]["camera"].isArray()) {
        if (json["data"]["camera"].size() > store::kMaxServerCameras) {
            throw NoAnswer("more cameras than a host may have");
        }
        return json["data"];
    }
    throw NoAnswer(kNotUnderstood);
} catch (const Json::Exception&) {
    throw NoAnswer(kNotUnderstood);
}

std::vector<store::RemoteCamera> CamerasInAnswer(const std::string& text) try {
    return CamerasIn(DataInAnswer(text)["camera"]);
} catch (const Json::Exception&) {
    throw NoAnswer(kNotUnderstood);
}

}  // namespace lookhaven::remote
