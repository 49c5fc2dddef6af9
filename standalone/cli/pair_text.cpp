// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/pair_text.h"

#include <optional>

#include "standalone/base/json_text.h"
#include "standalone/base/text.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

constexpr std::string_view kPrefix = "lookhaven-pair-1:";

// Throws Json::Exception for a member of the wrong type.
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

PairOffer Read(const Json::Value& json) {
    return {json["address"].asString(), json["port"].asInt(), json["certificate"].asString(), json["secret"].asString(),
            CamerasIn(json["cameras"])};
}

}  // namespace

std::vector<store::RemoteCamera> CamerasInAnswer(const std::string& text) try {
    const Json::Value json = ParseJson(text);
    if (json.isObject() && json["data"].isObject() && json["data"]["camera"].isArray()) {
        return CamerasIn(json["data"]["camera"]);
    }
    throw Failure(kDataError, "an answer that cannot be understood");
} catch (const Json::Exception&) {
    throw Failure(kDataError, "an answer with a member of the wrong type");
}

std::string ToText(const PairOffer& offer) {
    const Json::Value cameras = Array(offer.cameras, [](const store::RemoteCamera& camera) {
        return Object("id", camera.id_on_server, "name", camera.name, "video", static_cast<int>(camera.video_type),
                      "audio", camera.audio);
    });
    return std::string(kPrefix) +
           base::ToBase64(base::IndentedJson(Object("address", offer.address, "port", offer.port, "certificate",
                                                    offer.certificate, "secret", offer.secret, "cameras", cameras)));
}

PairOffer ParsePairText(const std::string& text) {
    std::string_view rest = text;
    if (rest.starts_with(kPrefix)) {
        rest.remove_prefix(kPrefix.size());
        const Json::Value json = ParseJson(base::FromBase64(rest).value_or(""));
        try {
            if (json.isObject()) {
                return Read(json);
            }
        } catch (const Json::Exception&) {
            // a member of the wrong type
        }
    }
    throw Failure(kDataError, "this is not a line that lookhaven server pair wrote");
}

}  // namespace lookhaven::cli
