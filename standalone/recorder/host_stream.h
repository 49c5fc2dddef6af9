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

// Another host of the store, and what a request to it needs.
struct OtherHost {
    int id = 0;
    std::string name;
    remote::Host host;
    std::string key;  // the store's, by which the tokens of hosts are made
    int own_id = 0;   // this host's

    // Whether a stream can go on: renaming a host does not interrupt it.
    bool operator==(const OtherHost& other) const {
        return id == other.id && host == other.host && key == other.key && own_id == other.own_id;
    }
};

// As media::OpenSource, without credentials: blocks for ten seconds at most until the formats are known. Those of sound
// have neither rate nor channels, so it can be heard but not recorded.
std::unique_ptr<media::Source> OpenHostStream(const OtherHost& other, control::LiveStream stream,
                                              const media::SourceOptions& options, std::stop_token stop);

}  // namespace lookhaven::recorder
