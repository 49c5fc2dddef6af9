// SPDX-License-Identifier: Apache-2.0
//
// The SCGI parser against requests that are whole, broken, hostile, and cut at any byte.
#include "standalone/host/scgi.h"

#include <algorithm>
#include <random>

#include <gtest/gtest.h>

#include "test/support/host/scgi_bytes.h"

namespace lookhaven::host {
namespace {

using State = ScgiParser::State;
using namespace std::string_literals;

// A bar stands for the zero byte.
std::string Head(std::string text) {
    std::replace(text.begin(), text.end(), '|', '\0');
    return text;
}

std::string Netstring(const std::string& text) {
    const std::string head = Head(text);
    return std::to_string(head.size()) + ":" + head + ",";
}

State FeedAll(ScgiParser& parser, std::string_view bytes, std::size_t step) {
    State state = State::kIncomplete;
    for (; !bytes.empty(); bytes.remove_prefix(std::min(step, bytes.size()))) {
        state = parser.Feed(bytes.substr(0, step));
    }
    return state;
}

TEST(Scgi, TakesARequestHoweverItIsCut) {
    const std::string bytes = ScgiBytes({{"REQUEST_METHOD", "POST"}, {"EMPTY", ""}}, "name=value\0,:"s);
    for (std::mt19937::result_type seed = 0; seed < 200; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        std::mt19937 random(seed);
        ScgiParser parser;
        std::string_view rest = bytes;
        while (!rest.empty()) {
            const std::size_t piece = std::min<std::size_t>(rest.size(), 1 + random() % 20);
            ASSERT_EQ(parser.Feed(rest.substr(0, piece)), piece == rest.size() ? State::kComplete : State::kIncomplete);
            rest.remove_prefix(piece);
        }
        const http::Request request = parser.TakeRequest();
        EXPECT_EQ(request.Header("REQUEST_METHOD"), "POST");
        EXPECT_EQ(request.headers.count("EMPTY"), 1U);
        EXPECT_EQ(request.body, "name=value\0,:"s);
    }
}

TEST(Scgi, JoinsTheLinesOfAHeaderAsTheirListIsWritten) {
    const std::string head =
        "CONTENT_LENGTH|0|SCGI|1|HTTP_COOKIE|a=1|HTTP_A|1|HTTP_COOKIE|b=2|HTTP_A||HTTP_COOKIE|c=3|";
    ScgiParser parser;
    ASSERT_EQ(parser.Feed(Netstring(head)), State::kComplete);
    const http::Request request = parser.TakeRequest();
    EXPECT_EQ(request.Header("HTTP_COOKIE"), "a=1; b=2; c=3");
    EXPECT_EQ(request.Header("HTTP_A"), "1, ");
}

TEST(Scgi, RefusesWhatIsNotARequest) {
    const std::string kStart = Head("CONTENT_LENGTH|0|SCGI|1|");
    const std::string kBig(ScgiParser::kMaxHeadBytes, 'x');
    const struct {
        const char* name;
        std::string bytes;
        State expected;
    } cases[] = {
        {"least request", Netstring(kStart), State::kComplete},
        {"largest head", Netstring(kStart + "A|" + kBig.substr(kStart.size() + 3) + "|"), State::kComplete},
        {"head too large", std::to_string(kBig.size() + 1) + ":", State::kMalformed},
        {"length without end", "99999999999999999999999999", State::kMalformed},
        {"negative length", "-5:", State::kMalformed},
        {"no length", ":", State::kMalformed},
        {"leading zero", "024:" + kStart + ",", State::kMalformed},
        {"HTTP", "GET / HTTP/1.1\r\n\r\n", State::kMalformed},
        {"space before length", " 24:" + kStart + ",", State::kMalformed},
        {"no comma", std::to_string(kStart.size()) + ":" + kStart + ";", State::kMalformed},
        {"length too small", std::to_string(kStart.size() - 1) + ":" + kStart + ",", State::kMalformed},
        {"length too large", std::to_string(kStart.size() + 1) + ":" + kStart + ",", State::kIncomplete},
        {"no CONTENT_LENGTH", Netstring("SCGI|1|"), State::kMalformed},
        {"CONTENT_LENGTH second", Netstring("SCGI|1|CONTENT_LENGTH|0|"), State::kMalformed},
        {"CONTENT_LENGTH twice", Netstring(kStart + "CONTENT_LENGTH|5|"), State::kMalformed},
        {"CONTENT_LENGTH empty", Netstring("CONTENT_LENGTH||SCGI|1|"), State::kMalformed},
        {"CONTENT_LENGTH negative", Netstring("CONTENT_LENGTH|-1|SCGI|1|"), State::kMalformed},
        {"CONTENT_LENGTH hex", Netstring("CONTENT_LENGTH|0x1|SCGI|1|"), State::kMalformed},
        {"CONTENT_LENGTH overflow", Netstring("CONTENT_LENGTH|99999999999999999999999|SCGI|1|"), State::kMalformed},
        {"body too large", Netstring("CONTENT_LENGTH|20971521|SCGI|1|"), State::kMalformed},
        {"largest body announced", Netstring("CONTENT_LENGTH|20971520|SCGI|1|"), State::kComplete},
        {"largest body awaited", Netstring("CONTENT_LENGTH|4096|SCGI|1|"), State::kIncomplete},
        {"SCGI missing", Netstring("CONTENT_LENGTH|0|"), State::kMalformed},
        {"SCGI 2", Netstring("CONTENT_LENGTH|0|SCGI|2|"), State::kMalformed},
        {"a name twice", Netstring(kStart + "A|1|A|2|"), State::kMalformed},
        {"empty name", Netstring(kStart + "|1|"), State::kMalformed},
        {"value without end", Netstring(kStart + "A|1"), State::kMalformed},
        {"name without value", Netstring(kStart + "A|"), State::kMalformed},
        {"bytes behind the body", Netstring(kStart) + "x", State::kMalformed},
    };
    for (const auto& each : cases) {
        for (const std::size_t step : {std::size_t{1}, each.bytes.size()}) {
            ScgiParser parser;
            EXPECT_EQ(FeedAll(parser, each.bytes, step), each.expected) << each.name << ", in steps of " << step;
            EXPECT_EQ(parser.Problem().empty(), each.expected != State::kMalformed) << each.name;
        }
    }
}

}  // namespace
}  // namespace lookhaven::host
