// SPDX-License-Identifier: Apache-2.0
#include "bench/footage.h"

#include <array>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <utility>

namespace bench {

namespace {

std::string ReadFile(const char* path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        throw std::runtime_error(std::string("cannot read ") + path);
    }
    return {std::istreambuf_iterator<char>(file), {}};
}

std::vector<std::vector<std::string>> SplitAnnexB(const std::string& bytes) {
    using namespace std::string_literals;
    constexpr int kDelimiter = 9;
    const std::string start = "\0\0\1"s;
    std::vector<std::vector<std::string>> frames;
    for (std::size_t at = bytes.find(start); at != bytes.npos;) {
        const std::size_t next = bytes.find(start, at + start.size());
        std::string nal = bytes.substr(at + start.size(), next == bytes.npos ? next : next - at - start.size());
        nal.erase(nal.find_last_not_of('\0') + 1);
        if ((nal.at(0) & 0x1f) == kDelimiter) {
            frames.emplace_back();
        } else {
            frames.at(frames.size() - 1).push_back(std::move(nal));
        }
        at = next;
    }
    return frames;
}

void SplitAdts(const std::string& bytes, Footage& footage) {
    constexpr std::size_t kHeadBytes = 7;
    const auto byte = [&bytes](std::size_t at) {
        return static_cast<unsigned>(static_cast<unsigned char>(bytes.at(at)));
    };
    const unsigned config =
        ((byte(2) >> 6) + 1) << 11 | (byte(2) >> 2 & 15) << 7 | ((byte(2) & 1) << 2 | byte(3) >> 6) << 3;
    std::array<char, 8> digits{};
    std::snprintf(digits.data(), digits.size(), "%04x", config);
    footage.audio_config = digits.data();
    for (std::size_t at = 0; at + kHeadBytes < bytes.size();) {
        const std::size_t size = (byte(at + 3) & 3) << 11 | byte(at + 4) << 3 | byte(at + 5) >> 5;
        footage.audio.push_back(bytes.substr(at + kHeadBytes, size - kHeadBytes));
        at += size;
    }
}

}  // namespace

Footage ReadFootage(const char* video, const char* audio, const char* picture) {
    Footage footage;
    footage.video = SplitAnnexB(ReadFile(video));
    SplitAdts(ReadFile(audio), footage);
    footage.jpeg = ReadFile(picture);
    return footage;
}

}  // namespace bench
