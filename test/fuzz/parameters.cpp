// SPDX-License-Identifier: Apache-2.0
//
// Feeds any bytes to the readers of parameters and cookies, as a query string and as a form or JSON body beside it.
// What they accept is text throughout, and can be written as JSON.
#include "standalone/api/parameters.h"

#include "standalone/base/text.h"
#include "standalone/binding/request.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

bool IsText(std::string_view bytes) {
    while (!bytes.empty()) {
        if (base::TakeCharacter(bytes).value_or(0) == 0) {
            return false;
        }
    }
    return true;
}

bool HoldsText(const Json::Value& value) {
    if (value.isString()) {
        return IsText(value.asString());
    }
    const auto names = value.isObject() ? value.getMemberNames() : Json::Value::Members{};
    return std::ranges::all_of(names, [](const std::string& name) { return IsText(name); }) &&
           std::all_of(value.begin(), value.end(), [](const Json::Value& member) { return HoldsText(member); });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const bool is_json = input.TakeUntil({"\0", 1}) == "json";
    const std::string query(input.TakeUntil({"\0", 1}));
    const http::Request request{{{"REQUEST_METHOD", "POST"},
                                 {"CONTENT_TYPE", is_json ? "application/json" : "application/x-www-form-urlencoded"},
                                 {"QUERY_STRING", query},
                                 {"HTTP_COOKIE", query}},
                                std::string(fuzz::Text(input.Rest()))};
    api::ReadCookies(request);
    try {
        api::Parameters parameters = api::ReadQuery(request);
        api::AddBody(request, parameters);
        for (const auto& [name, value] : parameters) {
            fuzz::Require(IsText(name) && HoldsText(value));
            binding::SuccessText(value);
        }
    } catch (const http::Failure& failure) {
        fuzz::Require(failure.Status() == 400);
    } catch (const Json::Exception&) {
        // nested too deep, which is answered as a failure 400
    }
    return 0;
}
