// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/scgi.h"

#include <algorithm>
#include <charconv>
#include <string>

namespace lookhaven::host {

ScgiParser::State ScgiParser::Feed(std::string_view bytes) {
    while (state_ == State::kIncomplete && !bytes.empty()) {
        switch (place_) {
        case Place::kLength:
            bytes.remove_prefix(TakeLength(bytes.front()));
            break;
        case Place::kHead:
            bytes.remove_prefix(TakeHead(bytes));
            break;
        case Place::kBody:
            bytes.remove_prefix(TakeBody(bytes));
            break;
        }
    }
    if (state_ == State::kComplete && !bytes.empty()) {
        Fail("there are bytes after the request's body");
    }
    if (state_ == State::kIncomplete && place_ == Place::kBody && body_bytes_ > kMaxAwaitedBodyBytes) {
        request_.unread_body_bytes = body_bytes_ - request_.body.size();
        state_ = State::kComplete;
    }
    return state_;
}

ScgiParser::~ScgiParser() {
    http::Wipe(head_);
    request_.Wipe();
}

std::size_t ScgiParser::TakeLength(char byte) {
    if (byte == ':' && head_bytes_ > 0) {
        place_ = Place::kHead;
    } else if (byte < '0' || byte > '9' || (byte == '0' && head_bytes_ == 0)) {
        Fail("the request does not begin with a length");
    } else {
        head_bytes_ = head_bytes_ * 10 + static_cast<std::size_t>(byte - '0');
        if (head_bytes_ > kMaxHeadBytes) {
            Fail("the request's head is too large");
        }
    }
    return 1;
}

std::size_t ScgiParser::TakeHead(std::string_view bytes) {
    const std::size_t used = std::min(bytes.size(), head_bytes_ + 1 - head_.size());
    head_.append(bytes.substr(0, used));
    if (head_.size() == head_bytes_ + 1) {
        ParseHead();
        http::Wipe(head_);
    }
    return used;
}

std::size_t ScgiParser::TakeBody(std::string_view bytes) {
    const std::size_t used = std::min(bytes.size(), body_bytes_ - request_.body.size());
    request_.body.append(bytes.substr(0, used));
    if (request_.body.size() == body_bytes_) {
        state_ = State::kComplete;
    }
    return used;
}

void ScgiParser::ParseHead() {
    if (head_.back() != ',') {
        return Fail("the request's head does not end where it should");
    }
    std::string_view rest(head_.data(), head_bytes_);
    while (!rest.empty()) {
        const std::size_t name_end = rest.find('\0');
        const std::size_t value_end = name_end == rest.npos ? rest.npos : rest.find('\0', name_end + 1);
        if (name_end == 0 || value_end == rest.npos) {
            return Fail("the request's head holds a broken line");
        }
        const std::string_view name = rest.substr(0, name_end);
        if (request_.headers.empty() != (name == "CONTENT_LENGTH")) {
            return Fail("CONTENT_LENGTH is not first, or twice");
        }
        const std::string_view value = rest.substr(name_end + 1, value_end - name_end - 1);
        const auto [line, is_new] = request_.headers.emplace(name, value);
        if (!is_new && !name.starts_with("HTTP_")) {
            return Fail("the request's head names a line twice");
        }
        if (!is_new) {  // a header that the client, or a proxy, sent in several lines
            line->second.append(name == "HTTP_COOKIE" ? "; " : ", ").append(value);
        }
        rest.remove_prefix(value_end + 1);
    }
    if (request_.Header("SCGI") != "1") {
        return Fail("the request is not SCGI 1");
    }
    ParseContentLength();
}

void ScgiParser::ParseContentLength() {
    const std::string_view text = request_.Header("CONTENT_LENGTH");
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), body_bytes_);
    if (text.empty() || end != text.data() + text.size()) {
        return Fail("CONTENT_LENGTH is not a number");
    }
    if (error != std::errc() || body_bytes_ > kMaxBodyBytes) {
        return Fail("the request's body is too large");
    }
    place_ = Place::kBody;
    if (body_bytes_ == 0) {
        state_ = State::kComplete;
    }
}

void ScgiParser::Fail(std::string_view problem) {
    state_ = State::kMalformed;
    problem_ = problem;
}

std::string ToScgi(const http::Request& request) {
    constexpr std::string_view kFirst = "CONTENT_LENGTH";
    const auto bytes_of = [](std::string_view name, std::string_view value) { return name.size() + value.size() + 2; };
    std::size_t head_bytes = 0;
    for (const auto& [name, value] : request.headers) {
        head_bytes += bytes_of(name, value);
    }
    std::string text;
    // At once, for a text that grows leaves copies behind.
    text.reserve(head_bytes + request.body.size() + 16);
    text.append(std::to_string(head_bytes)).append(1, ':');
    const auto add = [&text](std::string_view name, std::string_view value) {
        text.append(name).append(1, '\0').append(value).append(1, '\0');
    };
    add(kFirst, request.Header(kFirst));
    for (const auto& [name, value] : request.headers) {
        if (name != kFirst) {
            add(name, value);
        }
    }
    return text.append(1, ',').append(request.body);
}

}  // namespace lookhaven::host
