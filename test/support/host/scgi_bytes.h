// SPDX-License-Identifier: Apache-2.0
//
// The bytes of an SCGI request, as a web server sends them.
#pragma once

#include <map>
#include <string>

inline std::string ScgiBytes(const std::map<std::string, std::string>& headers, const std::string& body = "") {
    std::string head = "CONTENT_LENGTH";
    const auto append = [&head](const std::string& text) { head.append(text).push_back('\0'); };
    append("");
    append(std::to_string(body.size()));
    append("SCGI");
    append("1");
    for (const auto& [name, value] : headers) {
        append(name);
        append(value);
    }
    return std::to_string(head.size()) + ":" + head + "," + body;
}
