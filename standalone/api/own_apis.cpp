// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/own_apis.h"

#include <algorithm>
#include <array>

namespace lookhaven::api {

const Method& OwnApi::Find(int version, const std::string& method) const {
    const auto found =
        std::find_if(methods.begin(), methods.end(), [&method](const Method& each) { return method == each.name; });
    if (version != 1 || found == methods.end()) {
        throw Failure(404, "no such api, version or method");
    }
    return *found;
}

const OwnApi* FindOwnApi(const std::string& name) {
    static constexpr std::array kApis = {&kAuthApi,    &kCameraApi,   &kCatalogApi, &kDeviceApi, &kEmapApi,
                                         &kEventApi,   &kGroupApi,    &kHostApi,    &kMountApi,  &kPairingApi,
                                         &kPictureApi, &kPlaybackApi, &kRelayApi,   &kServerApi, &kSystemApi,
                                         &kTokenApi,   &kUserApi};
    const auto* const found =
        std::find_if(kApis.begin(), kApis.end(), [&name](const OwnApi* each) { return name == each->name; });
    return found == kApis.end() ? nullptr : *found;
}

}  // namespace lookhaven::api
