// SPDX-License-Identifier: Apache-2.0
//
// A host whose players the tests control and watch.
#pragma once

#include <chrono>
#include <csignal>
#include <filesystem>
#include <optional>
#include <string>

#include <gtest/gtest.h>

#include "standalone/store/settings.h"
#include "test/component/api/stream_reader.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::Eventually;
using host::HostUnderTest;

// A player's stream, read by the test.
class Player {
  public:
    Player(const HostUnderTest& host, const std::string& cookie, const std::string& query)
        : stream_(host.OpenQuery("api=VEXO.Lookhaven.Player&version=1&method=" + query, cookie)) {}

    // The number behind name in the newest part; waits for a part that came after this call. Nothing when it has ended.
    std::optional<int> Tell(const std::string& name) {
        stream_.Read();
        stream_.text.clear();
        const auto until = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        for (std::string wanted = name + "="; !stream_.HasEnded() && std::chrono::steady_clock::now() < until;
             stream_.Read()) {
            const std::size_t end = stream_.text.rfind(';');
            const std::size_t begin = end == stream_.text.npos ? end : stream_.text.rfind("rate=", end);
            const std::size_t at = begin == stream_.text.npos ? begin : stream_.text.find(wanted, begin);
            if (at != stream_.text.npos && at < end) {
                return std::stoi(stream_.text.substr(at + wanted.size()));
            }
        }
        return std::nullopt;
    }
    bool HasEnded() {
        stream_.Read();
        return stream_.HasEnded();
    }
    void Close() { stream_.Close(); }

  private:
    StreamReader stream_;
};

class Playback : public testing::Test {
  protected:
    Playback() { Allow(1); }
    // Its players tidy up behind themselves.
    ~Playback() override { host_.End(SIGTERM); }

    // So many players side by side.
    void Allow(int players) const {
        store::Store records = store::Store::Open(host_.Home().StoreUrl());
        store::Settings(records).Set("players_per_session", std::to_string(players));
    }
    Player Play(const std::string& query) {
        Player player(host_, session_.secret, query);
        EXPECT_TRUE(player.Tell("rate")) << query;
        return player;
    }
    Answer Ask(const std::string& method, const std::string& form, const std::string& cookie = "") const {
        return host_.Ask("api=VEXO.Playback&version=1&method=" + method, cookie.empty() ? session_.secret : cookie, {},
                         form);
    }
    std::filesystem::path PlayerFile() const { return "/tmp/player_src.pid." + session_.handle; }
    std::size_t ProgressFiles() const {
        std::error_code error;
        return static_cast<std::size_t>(
            std::distance(std::filesystem::directory_iterator(host_.Home().ProgressFolder(), error), {}));
    }

    HostUnderTest host_;
    store::NewSession session_ = host_.LogIn();
};

}  // namespace lookhaven::api
