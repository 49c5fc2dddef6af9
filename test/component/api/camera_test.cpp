// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Camera: where the stored password of a camera does not go, and where none is taken from.
#include <gtest/gtest.h>

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

}  // namespace
}  // namespace lookhaven::api
