// SPDX-License-Identifier: Apache-2.0
//
// What of another host's answer is passed on, and what of one that is broken.
#include "standalone/remote/forward.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/support/answering_host.h"

namespace lookhaven::remote {
namespace {

class Client : public AnswerSink {
  public:
    bool Begin(const AnswerHead& begun) override {
        head = begun;
        ++begins;
        return goes_on;
    }
    bool Write(std::span<const char> bytes) override {
        body.append(bytes.data(), bytes.size());
        return goes_on;
    }
    bool WantsMore() override { return true; }

    AnswerHead head;
    int begins = 0;
    std::string body;
    bool goes_on = true;
};

// Whether the whole answer came.
bool Ask(std::string_view answer, Client& client) {
    test::answer = answer;
    ForwardedRequest request{.query = "api=a", .headers = {"Cookie: __Host-id=c"}, .json = "{}"};
    return Finish(*std::unique_ptr<Forwarding>(LookhavenBeginForward({"127.0.0.1", 1, ""}, request, client)));
}

TEST(Forward, PassesOnWhatSaysWhatTheBodyIsAndNothingElse) {
    Client client;
    EXPECT_TRUE(Ask("HTTP/1.1 200 OK\r\nContent-Type: image/jpeg\r\nContent-Length: 4\r\netag: \"a\"\r\n"
                    "Set-Cookie: id=1\r\nX-Accel-Redirect: /internal\r\nServer: s\r\nVary: a\x01"
                    "b\r\nX-Capture-Time: " +
                        std::string(3'000, '1') + "\r\nLocation: /a\r\n\r\nabcd",
                    client));
    EXPECT_EQ(client.head.content_type, "image/jpeg");
    EXPECT_EQ(client.head.size_bytes, 4);
    EXPECT_EQ(client.head.location, "") << "it is no redirect";
    using Header = std::pair<std::string, std::string>;
    EXPECT_THAT(client.head.headers, testing::ElementsAre(Header("ETag", "\"a\"")));
    EXPECT_EQ(client.body, "abcd");
}

TEST(Forward, StatusesAreOfAnAnswerOrThereIsNone) {
    const struct {
        const char* head;
        int status;  // 0: no answer
        const char* location;
    } rows[] = {
        {"200 OK", 200, ""},
        {"206 Partial", 206, ""},
        {"100 Continue\r\n\r\nHTTP/1.1 200 OK", 200, ""},
        {"304 Not Modified", 304, ""},
        {"302 Found\r\nLocation: https://host:8443/webapi?a=b", 302, "/webapi?a=b"},
        {"302 Found\r\nLocation: /webapi?a=b", 302, "/webapi?a=b"},
        {"302 Found\r\nLocation: //elsewhere/", 302, ""},
        {"302 Found\r\nLocation: https://host//elsewhere/", 302, ""},
        {"302 Found\r\nLocation: /\\elsewhere/", 302, ""},
        {"302 Found\r\nLocation: javascript:alert(1)", 302, ""},
        {"404 Not Found\r\nLocation: /a", 404, ""},
        {"503 Service Unavailable", 503, ""},
        {"301 Moved\r\nLocation: /a", 0, ""},
        {"307 Moved\r\nLocation: /a", 0, ""},
        {"600 What", 0, ""},
        {"999 What", 0, ""},
        {"000 What", 0, ""},
        {"what", 0, ""},
    };
    for (const auto& row : rows) {
        Client client;
        try {
            Ask(std::string("HTTP/1.1 ").append(row.head).append("\r\nContent-Length: 0\r\n\r\n"), client);
            EXPECT_EQ(client.head.status, row.status) << row.head;
            EXPECT_EQ(client.head.location, row.location) << row.head;
            EXPECT_EQ(client.begins, 1) << row.head;
        } catch (const NoAnswer& error) {
            EXPECT_EQ(row.status, 0) << row.head << ": " << error.what();
            EXPECT_EQ(client.begins, 0) << row.head;
        }
    }
}

TEST(Forward, TellsAnAnswerThatIsCutFromAWholeOne) {
    const struct {
        const char* what;
        const char* answer;
        bool has_head;
        const char* body;
    } rows[] = {
        {"nothing", "", false, ""},
        {"half a head", "HTTP/1.1 200 OK\r\nContent-Type: image/jp", false, ""},
        {"no HTTP", "hello", false, ""},
        {"half a body", "HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nabcd", true, "abcd"},
        {"half a chunk", "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n9\r\nabcd", true, "abcd"},
        {"no last chunk", "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n4\r\nabcd\r\n", true, "abcd"},
    };
    for (const auto& row : rows) {
        Client client;
        if (row.has_head) {
            EXPECT_FALSE(Ask(row.answer, client)) << row.what;
        } else {
            EXPECT_THROW(Ask(row.answer, client), NoAnswer) << row.what;
        }
        EXPECT_EQ(client.begins, row.has_head ? 1 : 0) << row.what;
        EXPECT_EQ(client.body, row.body) << row.what;
    }
}

TEST(Forward, EndsWithItsClient) {
    Client client;
    client.goes_on = false;
    EXPECT_FALSE(Ask("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nabcd", client));
    EXPECT_EQ(client.body, "");
}

}  // namespace
}  // namespace lookhaven::remote
