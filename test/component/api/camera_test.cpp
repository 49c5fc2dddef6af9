// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Camera: where the stored password of a camera does not go, and where none is taken from; what state it tells.
#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/control/stream_counters.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/store/cameras.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {
namespace {

TEST(CameraApi, AStoredPasswordGoesToNobodyNew) {
    const host::HostUnderTest host;
    const std::string cookie = host.LogIn().secret;
    const auto ask = [&](const std::string& method, const std::string& body) {
        return host.Ask("api=VEXO.Camera&version=1&method=" + method, cookie, {{"CONTENT_TYPE", "application/json"}},
                        body);
    };
    const auto at = [](const std::string& address) {
        return R"("source": [{"profile": 0, "address": ")" + address + "\"}]";
    };
    Json::Value camera =
        ask("Add", R"({"name": "Gate", "account": "root", "password": "s3cret", )" + at("http://192.0.2.1/a") + "}")
            .Json()["data"]["camera"];
    const std::string again = R"(, "password": "again")";
    const struct {
        std::string change;
        int status;
    } rows[] = {
        {at("http://192.0.2.1:8080/a"), 400},
        {at("https://192.0.2.1/a"), 400},
        {at("rtsp://192.0.2.1:80/a"), 400},
        {at("http://192.0.2.2/a"), 400},
        {R"("insecure": true)", 400},
        {at("http://192.0.2.1:80/b"), 200},
        {R"("insecure": true)" + again, 200},
        {R"("insecure": true)", 200},
        {at("http://[2001:db8::1]:8080/") + again, 200},
        {at("http://[2001:DB8::1]:8080/b"), 200},
        {at("http://[2001:db8::1]/b"), 400},
        {R"("password": "")", 200},
        {at("rtsp://192.0.2.3/"), 200},
    };
    for (const auto& row : rows) {
        const host::Answer answer = ask("Set", R"({"id": )" + camera["id"].asString() + R"(, "revision": )" +
                                                   camera["revision"].asString() + ", " + row.change + "}");
        EXPECT_EQ(answer.status, row.status) << row.change << answer.body;
        camera = answer.status == 200 ? answer.Json()["data"]["camera"] : camera;
    }
    for (const char* method : {"Add", "Set", "Probe"}) {
        const host::Answer answer = ask(std::string(method) + "&password=s3cret", "{}");
        EXPECT_NE(answer.body.find("password belongs in the body"), std::string::npos) << method << answer.body;
    }
}

TEST(CameraApi, TellsWhetherPicturesComeSinceWhenNotAndWhyNot) {
    const host::HostUnderTest host;
    const std::string cookie = host.LogIn().secret;
    store::Store records = store::Store::Open(host.Home().StoreUrl());
    using enum base::SignalLoss;
    using maintenance::RecordingState;
    const struct {
        RecordingState recording;
        std::optional<base::SignalLoss> loss;
        bool is_enabled, is_streamed, has_picture;
        const char* told;  // state, reason, recording
    } rows[] = {
        {RecordingState::kRecording, {}, true, true, true, "running  recording"},
        {RecordingState::kReady, {}, true, true, false, "connecting  ready"},
        {RecordingState::kReady, {}, true, false, false, "idle  ready"},
        {RecordingState::kNoSignal, kRefused, true, true, false, "no-signal refused no-signal"},
        {RecordingState::kNoSignal, kWrongPassword, true, true, false, "no-signal wrong-password no-signal"},
        {RecordingState::kNoSignal, kStalled, true, true, false, "no-signal stalled no-signal"},
        {RecordingState::kNoSignal, kUnknownHost, true, true, false, "no-signal unknown-host no-signal"},
        {RecordingState::kDiskFull, kRefused, true, true, false, "no-signal refused disk-full"},
        {RecordingState::kReady, {}, false, false, false, "disabled  ready"},
    };
    std::vector<maintenance::CameraStatus> states;
    std::vector<control::StreamCounters> streams;
    for (const auto& row : rows) {
        store::Camera camera;
        camera.name = "Camera";
        camera.enabled = row.is_enabled;
        camera.profiles = {{0, "test:mjpeg", 0, 0, 0}};
        const int id = store::Cameras(records).Add(camera);
        states.push_back({.camera = id, .state = row.recording});
        if (row.loss) {
            states.back().lost_since_s = 1'772'352'930 + id;
            states.back().loss = *row.loss;
        }
        if (row.is_streamed) {
            streams.push_back(
                {.stream = {id, 0}, .pictures = row.has_picture ? 9U : 0U, .last_picture_us = base::MonotonicMicros()});
        }
    }
    maintenance::WriteCameraStatus(host.Home(), states);
    control::StreamCountersWriter(host.Home()).Write(streams);
    for (const bool is_alive : {false, true}) {
        if (is_alive) {
            control::CommonConfigKeeper(host.Home()).Refresh(false);
        }
        const Json::Value told =
            host.Ask("api=VEXO.Camera&version=1&method=List", cookie, {{"CONTENT_TYPE", "application/json"}}, "{}")
                .Json()["data"]["camera"];
        ASSERT_EQ(told.size(), std::size(rows));
        for (Json::ArrayIndex i = 0; i < told.size(); ++i) {
            const auto& row = rows[i];
            const Json::Value& one = told[i];
            EXPECT_EQ(one["state"].asString() + ' ' + one["reason"].asString() + ' ' + one["recording"].asString(),
                      is_alive         ? row.told
                      : row.is_enabled ? "unknown  "
                                       : "disabled  ");
            EXPECT_EQ(one["since"],
                      is_alive && row.loss ? Json::Value(Json::Int64{states[i].lost_since_s}) : Json::Value());
        }
    }
}

}  // namespace
}  // namespace lookhaven::api
