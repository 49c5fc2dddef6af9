// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/parameters.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <string_view>

#include "standalone/base/text.h"
#include "standalone/binding/request.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxParameters = 300;

// Cuts the text at the first separator; returns what stands before it.
std::string_view CutFront(std::string_view& text, char separator) {
    const std::size_t end = std::min(text.find(separator), text.size());
    const std::string_view front = text.substr(0, end);
    text.remove_prefix(std::min(end + 1, text.size()));
    return front;
}

std::string_view Trim(std::string_view text) {
    const std::size_t begin = std::min(text.find_first_not_of(" \t"), text.size());
    return text.substr(begin, text.find_last_not_of(" \t") + 1 - begin);
}

// UTF-8 without NUL.
bool IsText(std::string_view bytes) {
    while (!bytes.empty()) {
        if (base::TakeCharacter(bytes).value_or(0) == 0) {
            return false;
        }
    }
    return true;
}

// The same for all texts inside: an escape of JSON too may stand for a NUL, or for half a character.
bool IsText(const Json::Value& value) {
    if (value.isString()) {
        return IsText(std::string_view(value.asString()));
    }
    if (value.isObject()) {
        const Json::Value::Members names = value.getMemberNames();
        if (!std::ranges::all_of(names, [](const std::string& name) { return IsText(std::string_view(name)); })) {
            return false;
        }
    }
    return std::all_of(value.begin(), value.end(), [](const Json::Value& member) { return IsText(member); });
}

std::string Unescape(std::string_view text) {
    const std::optional<std::string> plain = base::DecodeForm(text, base::BrokenEscape::kRefuse);
    if (!plain) {
        throw http::Failure(400, "a parameter holds a broken escape");
    }
    if (!IsText(std::string_view(*plain))) {
        throw http::Failure(400, "a parameter is not UTF-8 text");
    }
    return *plain;
}

bool NamesMethod(const std::string& name) {
    return name == "api" || name == "version" || name == "method";
}

void Add(const std::string& name, Json::Value value, Parameters& parameters) {
    if (!IsText(std::string_view(name)) || !IsText(value)) {
        throw http::Failure(400, "a parameter is not UTF-8 text");
    }
    const bool is_new = parameters.insert_or_assign(name, std::move(value)).second;
    if (!is_new && NamesMethod(name)) {
        throw http::Failure(400, "the parameter " + name + " is named twice");
    }
    if (parameters.size() > kMaxParameters) {
        throw http::Failure(400, "the request has more than " + std::to_string(kMaxParameters) + " parameters");
    }
}

Parameters ReadForm(std::string_view form) {
    Parameters parameters;
    for (std::size_t pairs = 0; !form.empty(); ++pairs) {
        if (pairs >= kMaxParameters) {
            throw http::Failure(400, "the request has more than " + std::to_string(kMaxParameters) + " parameters");
        }
        std::string_view value = CutFront(form, '&');
        const std::string name = Unescape(CutFront(value, '='));
        if (!name.empty()) {
            Add(name, binding::JsonFromText(name, Unescape(value)), parameters);
        }
    }
    return parameters;
}

Parameters ReadJson(const std::string& body) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value root;
    // The reader throws Json::Exception for a text that is nested too deep; that is answered like any wrong JSON.
    if (!IsText(std::string_view(body)) || !reader->parse(body.data(), body.data() + body.size(), &root, nullptr) ||
        !root.isObject()) {
        throw http::Failure(400, "the body is not a JSON object");
    }
    Parameters parameters;
    for (const std::string& name : root.getMemberNames()) {
        if (binding::IsAlwaysText(name) && !root[name].isString()) {
            throw http::Failure(400, "the parameter " + name + " is not a text");
        }
        Add(name, root[name], parameters);
    }
    return parameters;
}

}  // namespace

Parameters ReadQuery(const http::Request& request) {
    return ReadForm(request.Header("QUERY_STRING"));
}

void AddBody(const http::Request& request, Parameters& parameters) {
    if (request.Header("REQUEST_METHOD") != "POST" || request.body.empty()) {
        return;
    }
    std::string_view rest = request.Header("CONTENT_TYPE");
    const std::string_view type = Trim(CutFront(rest, ';'));
    if (type != "application/json" && type != "application/x-www-form-urlencoded") {
        throw http::Failure(400, "the body is neither a form nor JSON");
    }
    const bool query_names_api = parameters.contains("api");
    for (auto& [name, value] : type == "application/json" ? ReadJson(request.body) : ReadForm(request.body)) {
        if (NamesMethod(name) && (query_names_api || parameters.contains(name))) {
            throw http::Failure(400, "the parameter " + name + " belongs in the query string, once");
        }
        Add(name, value, parameters);
    }
}

std::map<std::string, std::string> ReadCookies(const http::Request& request) {
    std::map<std::string, std::string> cookies;
    for (std::string_view rest = request.Header("HTTP_COOKIE"); !rest.empty();) {
        std::string_view value = CutFront(rest, ';');
        if (value.find('=') != value.npos) {
            const std::string_view name = Trim(CutFront(value, '='));
            cookies.emplace(name, Trim(value));
        }
    }
    return cookies;
}

}  // namespace lookhaven::api
