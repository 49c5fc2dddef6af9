// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/parameters.h"

#include <algorithm>
#include <charconv>
#include <memory>
#include <string_view>

#include "standalone/binding/request.h"

namespace lookhaven::api {

namespace {

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

// Well-formed UTF-8 without NUL: shortest forms only, no surrogates, nothing above U+10FFFF.
bool IsText(std::string_view bytes) {
    while (!bytes.empty()) {
        const auto at = [&](std::size_t i) { return i < bytes.size() ? static_cast<unsigned char>(bytes[i]) : 0U; };
        const unsigned int first = at(0);
        const std::size_t length = first < 0x80 ? 1 : first < 0xe0 ? 2 : first < 0xf0 ? 3 : 4;
        const bool bad_first = first == 0 || (first >= 0x80 && first < 0xc2) || first > 0xf4;
        const bool bad_second = (first == 0xe0 && at(1) < 0xa0) || (first == 0xed && at(1) > 0x9f) ||
                                (first == 0xf0 && at(1) < 0x90) || (first == 0xf4 && at(1) > 0x8f);
        if (bad_first || bad_second) {
            return false;
        }
        for (std::size_t i = 1; i < length; ++i) {
            if ((at(i) & 0xc0) != 0x80) {
                return false;
            }
        }
        bytes.remove_prefix(length);
    }
    return true;
}

std::string Unescape(std::string_view text) {
    std::string plain;
    plain.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            plain += text[i] == '+' ? ' ' : text[i];
            continue;
        }
        unsigned int byte = 0;
        const std::string_view digits = text.substr(i + 1, 2);
        const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), byte, 16);
        if (error != std::errc() || digits.size() != 2 || end != digits.data() + 2) {
            throw http::Failure(400, "a parameter holds a broken escape");
        }
        plain += static_cast<char>(byte);
        i += 2;
    }
    if (!IsText(plain)) {
        throw http::Failure(400, "a parameter is not UTF-8 text");
    }
    return plain;
}

void ReadForm(std::string_view form, Parameters& parameters) {
    while (!form.empty()) {
        std::string_view value = CutFront(form, '&');
        const std::string name = Unescape(CutFront(value, '='));
        if (!name.empty()) {
            parameters[name] = binding::JsonFromText(name, Unescape(value));
        }
    }
}

void ReadJson(const std::string& body, Parameters& parameters) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value root;
    // The reader throws Json::Exception for a text that is nested too deep; that is answered like any wrong JSON.
    if (!IsText(body) || !reader->parse(body.data(), body.data() + body.size(), &root, nullptr) || !root.isObject()) {
        throw http::Failure(400, "the body is not a JSON object");
    }
    for (const std::string& name : root.getMemberNames()) {
        if (binding::IsAlwaysText(name) && !root[name].isString()) {
            throw http::Failure(400, "the parameter " + name + " is not a text");
        }
        parameters[name] = root[name];
    }
}

}  // namespace

Parameters ReadParameters(const http::Request& request) {
    Parameters parameters;
    ReadForm(request.Header("QUERY_STRING"), parameters);
    if (request.Header("REQUEST_METHOD") != "POST" || request.body.empty()) {
        return parameters;
    }
    std::string_view rest = request.Header("CONTENT_TYPE");
    const std::string_view type = Trim(CutFront(rest, ';'));
    if (type == "application/json") {
        ReadJson(request.body, parameters);
    } else if (type == "application/x-www-form-urlencoded") {
        ReadForm(request.body, parameters);
    } else {
        throw http::Failure(400, "the body is neither a form nor JSON");
    }
    return parameters;
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
