// SPDX-License-Identifier: Apache-2.0
//
// The parts of a multipart stream that has ended.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "test/component/api/event_fixture.h"

namespace lookhaven::api {

struct StreamPart {
    std::map<std::string, std::string> head;
    std::string body;

    bool IsVideo() const { return head.at("Content-Type").starts_with("image/"); }
    std::int64_t CapturedMs() const { return std::llround(std::stod(head.at("X-Capture-Time")) * 1000); }
};

struct Parts {
    std::vector<StreamPart> all;
    bool is_whole = false;  // ended by the last boundary

    explicit Parts(const Answer& answer) : Parts(answer.headers.at("Content-Type"), answer.body) {}
    Parts(const std::string& content_type, const std::string& body) {
        const std::string boundary = "--" + content_type.substr(content_type.find("boundary=") + 9);
        for (std::size_t at = 0; body.compare(at, boundary.size() + 2, boundary + "\r\n") == 0;) {
            StreamPart& part = all.emplace_back();
            const std::size_t end = body.find("\r\n\r\n", at);
            std::istringstream lines(body.substr(at + boundary.size() + 2, end - at - boundary.size() - 2));
            for (std::string line; std::getline(lines, line, '\r'); lines.ignore()) {
                part.head[line.substr(0, line.find(": "))] = line.substr(line.find(": ") + 2);
            }
            part.body = body.substr(end + 4, std::stoul(part.head.at("Content-Length")));
            at = end + 4 + part.body.size() + 2;
            is_whole = body.substr(std::min(at, body.size())) == boundary + "--\r\n";
        }
    }
    std::size_t Count(bool is_video) const {
        return static_cast<std::size_t>(
            std::ranges::count_if(all, [&](const StreamPart& part) { return part.IsVideo() == is_video; }));
    }
};

}  // namespace lookhaven::api
