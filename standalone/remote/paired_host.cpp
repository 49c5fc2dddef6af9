// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/paired_host.h"

#include <exception>
#include <future>

#include "standalone/base/clock.h"
#include "standalone/remote/camera_list.h"
#include "standalone/remote/fetch.h"
#include "standalone/remote/pair_token.h"

namespace lookhaven::remote {

PairedHostAnswer AskPairedHost(const store::RecordingServer& server, const std::string& secret) {
    PairedHostAnswer answer{server, {}, {}};
    try {
        const std::string timestamp = std::to_string(base::WallSeconds());
        const std::string token = MakePairToken(secret, timestamp);
        answer.cameras = CamerasInAnswer(
            FetchJson({server.address, server.port, server.certificate},
                      {"api=VEXO.Pairing&version=1&method=Cameras", "timestamp=" + timestamp + "; token=" + token}));
    } catch (const std::exception& failure) {
        answer.failure = failure.what();
    }
    return answer;
}

std::vector<PairedHostAnswer> AskPairedHosts(store::Store& store) {
    store::RecordingServers servers(store);
    std::vector<std::future<PairedHostAnswer>> asked;
    for (const store::RecordingServer& server : servers.List()) {
        if (server.enabled && !server.address.empty()) {
            asked.push_back(std::async(std::launch::async, AskPairedHost, server, servers.FindSecret(server.id)));
        }
    }
    std::vector<PairedHostAnswer> answers;
    answers.reserve(asked.size());
    for (std::future<PairedHostAnswer>& answer : asked) {
        answers.push_back(answer.get());
    }
    return answers;
}

}  // namespace lookhaven::remote
