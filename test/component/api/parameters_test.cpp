// SPDX-License-Identifier: Apache-2.0
//
// What a handler gets for a parameter, from the bytes of the request to GetParam.
#include "standalone/api/parameters.h"

#include <limits>

#include <gtest/gtest.h>

#include "standalone/binding/request.h"

namespace lookhaven::api {
namespace {

Json::Value Parsed(const std::string& text) {
    Json::Value value;
    Json::Reader().parse(text, value);
    return value;
}

http::Request Get(const std::string& query) {
    return {{{"REQUEST_METHOD", "GET"}, {"QUERY_STRING", query}}, ""};
}

http::Request Post(const std::string& query, const std::string& type, const std::string& body) {
    return {{{"REQUEST_METHOD", "POST"}, {"QUERY_STRING", query}, {"CONTENT_TYPE", type}}, body};
}

Parameters ReadParameters(const http::Request& request) {
    Parameters parameters = ReadQuery(request);
    AddBody(request, parameters);
    return parameters;
}

Json::Value Param(const http::Request& request, const std::string& name, const Json::Value& fallback) {
    VEXO::APIRequest::Context context;
    context.parameters = ReadParameters(request);
    return VEXO::APIRequest(context).GetParam(name, fallback);
}

TEST(GetParam, TakesTextAsJsonOnlyWhenNothingIsLost) {
    const struct {
        const char* text;  // escaped as in a query
        Json::Value expected;
    } cases[] = {
        {"5", 5},
        {"-3", -3},
        {"2147483648", Json::Int64(2147483648)},
        {"0.1", 0.1},
        {"true", true},
        {"null", Json::nullValue},
        {"%22abc%22", "abc"},
        {"%7B%22b%22:1,%20%22a%22:%5B2%5D%7D", Parsed("{\"a\":[2],\"b\":1}")},
        {"5,7", "5,7"},
        {"007", "007"},
        {"1e5", "1e5"},
        {"+5", " 5"},
        {"-0", "-0"},
        {"5x", "5x"},
        {"True", "True"},
        {"NaN", "NaN"},
        {"123456789012345678901234567890", "123456789012345678901234567890"},
        {"%7B%22a%22:1%7Dx", "{\"a\":1}x"},
        {"%7B%22a%22:1,%22a%22:2%7D", "{\"a\":1,\"a\":2}"},
        {"%5B1,%5D", "[1,]"},
        {"[007]", "[007]"},
        {"%7B%22a%22:%5B1e5%5D%7D", "{\"a\":[1e5]}"},
        {"[123456789012345678901234567890]", "[123456789012345678901234567890]"},
        {"", ""},
        {"K%C3%BCche", "K\xc3\xbc"
                       "che"},
    };
    for (const auto& each : cases) {
        const Json::Value got = Param(Get("p=" + std::string(each.text)), "p", "default");
        EXPECT_EQ(got, each.expected) << each.text;
        EXPECT_EQ(got.type() == Json::stringValue, each.expected.type() == Json::stringValue) << each.text;
    }
    const std::string deep(5000, '[');
    EXPECT_EQ(Param(Get("p=" + deep), "p", ""), deep);
    for (const char* name : {"account", "password", "cookie"}) {
        EXPECT_EQ(Param(Get(std::string(name) + "=5"), name, ""), "5");
    }
}

TEST(GetParam, GivesDefaults) {
    EXPECT_EQ(Param(Get(""), "p", "0"), 0) << "a string default goes the way of a parameter's text";
    EXPECT_EQ(Param(Get(""), "p", "FailedCookie"), "FailedCookie");
    EXPECT_EQ(Param(Get(""), "cookie", "0"), "0");
    EXPECT_EQ(Param(Get("p=1"), "p", false), false) << "a boolean default takes booleans only";
    EXPECT_EQ(Param(Get("p=yes"), "p", true), true);
    EXPECT_EQ(Param(Get("p=true"), "p", false), true);
    EXPECT_EQ(Param(Get(""), "p", Json::nullValue), Json::nullValue);
}

TEST(GetParam, GivesAllUnderTheEmptyNameButSecrets) {
    EXPECT_EQ(Param(Get("a=1&password=x&cookie=y&b=z"), "", 0), Parsed("{\"a\":1,\"b\":\"z\"}"));
}

TEST(Parameters, ComeFromQueryFormAndJson) {
    const std::string form = "application/x-www-form-urlencoded";
    EXPECT_EQ(Param(Post("p=1", form + "; charset=utf-8", "p=a+b%26"), "p", 0), "a b&") << "the body counts";
    EXPECT_EQ(Param(Post("q=1", form, "p=2"), "q", 0), 1);
    EXPECT_EQ(Param(Post("", "application/json", "{\"p\":\"5\"}"), "p", 0), "5") << "JSON is typed already";
    EXPECT_EQ(Param(Get("p=1&p=2&=3&&q"), "p", 0), 2);
}

TEST(Parameters, RefusesBrokenOnes) {
    const std::string json = "application/json";
    const std::string form = "application/x-www-form-urlencoded";
    const std::string nested(100'000, '[');
    std::string many;
    for (int i = 0; i <= 300; ++i) {
        many += "p" + std::to_string(i) + "=1&";
    }
    const http::Request cases[] = {
        Get("p=%"),
        Get("p=%4"),
        Get("p=%zz"),
        Get("p=%-1"),
        Get("p=%00"),
        Get("p=%ff"),
        Get("p=%22%5Cu0000%22"),
        Post("", json, R"({"a":"\u0000"})"),
        Post("", json, R"({"a":[{"b\u0000":1}]})"),
        Post("", json, R"({"a\u0000":1})"),
        Post("", json, R"({"a":"\udc00"})"),
        Get("p=%c0%80"),
        Get("p=%ed%a0%80"),
        Get("p=%f4%90%80%80"),
        Get("p=%e2%82"),
        Post("", json, "[1]"),
        Post("", json, "{"),
        Post("", json, "{\"a\":1}{}"),
        Post("", json, "{\"a\":1,\"a\":2}"),
        Post("", json, "{\"password\":12345678}"),
        Post("", "text/plain", "p=1"),
        Post("", json, nested),
        // The web server must see the api that is served: named once, and in the address where that names any.
        Get("api=VEXO.Event&api=VEXO.Auth"),
        Get("api=VEXO.Event&%61pi=VEXO.Auth"),
        Get("api=VEXO.Event&method=Mark&metho%64=Login"),
        Post("api=VEXO.Event", form, "api=VEXO.Auth"),
        Post("api=VEXO.Event", json, "{\"api\":\"VEXO.Auth\"}"),
        Post("api=VEXO.Event", form, "method=Login"),
        Post("method=Mark", form, "api=VEXO.Auth&method=Login"),
        Post("", form, "api=VEXO.Event&%61pi=VEXO.Auth"),
        Get(many),
        Post("", form, many),
    };
    for (const http::Request& request : cases) {
        bool refused = false;
        try {
            ReadParameters(request);
        } catch (const http::Failure& failure) {
            refused = failure.Status() == 400;
        } catch (const Json::Exception&) {
            refused = true;
        }
        EXPECT_TRUE(refused) << request.Header("QUERY_STRING") << request.body.substr(0, 20);
    }
}

TEST(Cookies, SurviveBrokenNeighbours) {
    const http::Request request{{{"HTTP_COOKIE", " a=1;;novalue; id=abc=def ;=x;id=second"}}, ""};
    const auto cookies = ReadCookies(request);
    EXPECT_EQ(cookies.at("a"), "1");
    EXPECT_EQ(cookies.at("id"), "abc=def") << "the first of a name counts";
    EXPECT_EQ(cookies.count("novalue"), 0U);
}

}  // namespace
}  // namespace lookhaven::api
