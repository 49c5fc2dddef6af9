// SPDX-License-Identifier: Apache-2.0
//
// The live stream of a camera that another host of the store records, as a source: that host is asked once, however
// many viewers watch it here.
#pragma once

#include <memory>
#include <stop_token>
#include <string>

#include "standalone/control/demand.h"
#include "standalone/media/source.h"
#include "standalone/remote/fetch.h"

namespace lookhaven::recorder {

// A host that has a camera, and what it takes this one by.
struct OtherHost {
    int id = 0;
    std::string name;
    remote::Host host;
    std::string key;          // of the store's sessions
    std::string own_address;  // of this host, as the other knows it

    bool operator==(const OtherHost&) const = default;
};

// As media::OpenSource. The formats of its sound have neither rate nor channels, so its packets can be shown but not
// recorded.
std::unique_ptr<media::Source> OpenHostStream(const OtherHost& other, control::LiveStream stream,
                                              const media::SourceOptions& options, std::stop_token stop);

}  // namespace lookhaven::recorder
