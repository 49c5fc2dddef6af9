// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/pair_text.h"

#include <optional>

#include "standalone/base/json_text.h"
#include "standalone/base/text.h"
#include "standalone/cli/console.h"
#include "standalone/remote/camera_list.h"

namespace lookhaven::cli {

namespace {

PairOffer Read(const Json::Value& json) {
    return {json["address"].asString(), json["port"].asInt(), json["certificate"].asString(), json["secret"].asString(),
            remote::CamerasIn(json["cameras"])};
}

}  // namespace

std::string ToText(const PairOffer& offer) {
    const Json::Value cameras = Array(offer.cameras, [](const store::RemoteCamera& camera) {
        return Object("id", camera.id_on_server, "name", camera.name, "video", static_cast<int>(camera.video_type),
                      "audio", camera.audio);
    });
    return std::string(kPairTextPrefix) +
           base::ToBase64(base::IndentedJson(Object("address", offer.address, "port", offer.port, "certificate",
                                                    offer.certificate, "secret", offer.secret, "cameras", cameras)));
}

PairOffer ParsePairText(const std::string& text) {
    std::string_view rest = text;
    if (rest.starts_with(kPairTextPrefix)) {
        rest.remove_prefix(kPairTextPrefix.size());
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
