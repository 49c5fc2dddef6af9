// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/pair_text.h"

#include <memory>
#include <optional>

#include "standalone/base/text.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

constexpr std::string_view kPrefix = "lookhaven-pair-1:";

Json::Value ParseJson(const std::string& text) {
    Json::CharReaderBuilder builder;
    builder["stackLimit"] = 8;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string ignored;
    return reader->parse(text.data(), text.data() + text.size(), &value, &ignored) ? value : Json::Value();
}

PairOffer Read(const Json::Value& json) {
    PairOffer offer{json["address"].asString(),
                    json["port"].asInt(),
                    json["certificate"].asString(),
                    json["secret"].asString(),
                    {}};
    for (const Json::Value& camera : json["cameras"]) {
        offer.cameras.push_back({.id_on_server = camera["id"].asInt(),
                                 .name = camera["name"].asString(),
                                 .video_type = static_cast<base::Codec>(camera["video"].asInt()),
                                 .audio = camera["audio"].asBool()});
    }
    return offer;
}

}  // namespace

std::string ToText(const PairOffer& offer) {
    Json::Value json;
    json["address"] = offer.address;
    json["port"] = offer.port;
    json["certificate"] = offer.certificate;
    json["secret"] = offer.secret;
    json["cameras"] = Json::arrayValue;
    for (const store::RemoteCamera& camera : offer.cameras) {
        Json::Value& entry = json["cameras"].append(Json::objectValue);
        entry["id"] = camera.id_on_server;
        entry["name"] = camera.name;
        entry["video"] = static_cast<int>(camera.video_type);
        entry["audio"] = camera.audio;
    }
    return std::string(kPrefix) + base::ToBase64(ToJson(json));
}

PairOffer ParsePairText(const std::string& text) {
    std::string_view rest = text;
    if (rest.starts_with(kPrefix)) {
        rest.remove_prefix(kPrefix.size());
        if (const std::optional<std::string> json = base::FromBase64(rest)) {
            try {
                return Read(ParseJson(*json));
            } catch (const Json::Exception&) {
            }
        }
    }
    throw Failure(kDataError, "this is no text that lookhaven server pair wrote");
}

}  // namespace lookhaven::cli
