// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/multipart_reader.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cstring>
#include <utility>

#include <strings.h>

#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::size_t kBufferBytes = 65536;
constexpr std::size_t kMaxLineBytes = 4096;
constexpr int kMaxHeadLines = 64;
constexpr std::uint8_t kFirstOfPicture = 0xff;

}  // namespace

std::string BoundaryOf(std::string_view content_type) {
    constexpr std::string_view kMultipart = "multipart/";
    constexpr std::string_view kBoundary = "boundary=";
    const auto same = [](char a, char b) { return std::tolower(a) == std::tolower(b); };
    const auto found = std::search(content_type.begin(), content_type.end(), kBoundary.begin(), kBoundary.end(), same);
    if (found == content_type.end() || content_type.size() < kMultipart.size() ||
        !std::equal(kMultipart.begin(), kMultipart.end(), content_type.begin(), same)) {
        return {};
    }
    std::string_view boundary(found + kBoundary.size(), content_type.end());
    if (boundary.starts_with('"')) {
        boundary.remove_prefix(1);
        return std::string(boundary.substr(0, boundary.find('"')));
    }
    return std::string(boundary.substr(0, boundary.find_first_of("; \t")));
}

MultipartReader::MultipartReader(std::string boundary, std::size_t max_part_bytes, Input input)
    // Some cameras include the delimiter's dashes in the boundary's name.
    : delimiter_(boundary.starts_with("--") ? std::move(boundary) : "--" + boundary),
      max_part_bytes_(max_part_bytes),
      input_(std::move(input)),
      buffer_(kBufferBytes) {}

std::span<const std::uint8_t> MultipartReader::Next() {
    for (;;) {
        SkipToBoundary();
        const std::size_t size = ReadHead();
        if (size > 0 ? ReadSized(size) : ReadToBoundary()) {
            return part_;
        }
    }
}

std::uint8_t MultipartReader::Peek() {
    if (begin_ == end_) {
        begin_ = 0;
        end_ = input_(buffer_);
    }
    return buffer_[begin_];
}

std::uint8_t MultipartReader::ReadByte() {
    const std::uint8_t byte = Peek();
    ++begin_;
    return byte;
}

std::string MultipartReader::ReadLine() {
    std::string line;
    for (;;) {
        const char c = static_cast<char>(ReadByte());
        if (c == '\n') {
            line.erase(line.find_last_not_of("\r \t") + 1);
            return line;
        }
        if (line.size() == kMaxLineBytes) {
            throw SourceError("sends a multipart answer with overlong lines");
        }
        line += c;
    }
}

void MultipartReader::SkipToBoundary() {
    if (std::exchange(at_boundary_, false)) {
        return;
    }
    for (int lines = 0; lines < kMaxHeadLines; ++lines) {
        std::string line = ReadLine();
        if (line == delimiter_) {
            return;
        }
        if (line == "--" + delimiter_) {
            delimiter_ = std::move(line);  // the dashes were part of the boundary's name
            return;
        }
        if (line == delimiter_ + "--") {
            throw SourceError("the camera ended the stream");
        }
    }
    throw SourceError("sends no multipart answer");
}

// The part's length, or 0 when its headers do not give it. Some cameras send blank lines before the headers. A part
// without headers begins with its picture, and no picture begins with a letter.
std::size_t MultipartReader::ReadHead() {
    constexpr std::string_view kLength = "content-length:";
    std::size_t size = 0;
    bool has_fields = false;
    for (int lines = 0; lines < kMaxHeadLines; ++lines) {
        const std::string line = ReadLine();
        if (line.empty() && (has_fields || Peek() == kFirstOfPicture)) {
            return size;
        }
        has_fields |= !line.empty();
        if (line.size() > kLength.size() && strncasecmp(line.data(), kLength.data(), kLength.size()) == 0) {
            const std::size_t digits = line.find_first_not_of(" \t", kLength.size());
            std::from_chars(line.data() + digits, line.data() + line.size(), size);
        }
    }
    throw SourceError("sends a multipart head without an end");
}

// False when the part is too large; it is skipped then.
bool MultipartReader::ReadSized(std::size_t size) {
    const bool fits = size <= max_part_bytes_;
    part_.resize(fits ? size : 0);
    for (std::size_t done = 0; done < size;) {
        if (begin_ == end_) {
            begin_ = 0;
            end_ = input_(buffer_);
        }
        const std::size_t step = std::min(size - done, end_ - begin_);
        if (fits) {
            std::memcpy(part_.data() + done, buffer_.data() + begin_, step);
        }
        begin_ += step;
        done += step;
    }
    return fits;
}

bool MultipartReader::ReadToBoundary() {
    const std::string end = "\n" + delimiter_;
    bool fits = true;
    part_.clear();
    for (;;) {
        part_.push_back(ReadByte());
        const auto tail = static_cast<std::size_t>(end.size());
        if (part_.back() == static_cast<std::uint8_t>(end.back()) && part_.size() >= tail &&
            std::equal(end.begin(), end.end(), part_.end() - static_cast<std::ptrdiff_t>(tail),
                       [](char a, std::uint8_t b) { return static_cast<std::uint8_t>(a) == b; })) {
            part_.resize(part_.size() - tail);
            if (!part_.empty() && part_.back() == '\r') {
                part_.pop_back();
            }
            break;
        }
        if (part_.size() > max_part_bytes_ + 1 + tail) {
            // Too large: keep only what may be the beginning of a boundary, with the carriage return before it.
            part_.erase(part_.begin(), part_.end() - static_cast<std::ptrdiff_t>(tail + 1));
            fits = false;
        }
    }
    if (ReadLine() == "--") {
        throw SourceError("the camera ended the stream");
    }
    at_boundary_ = true;
    return fits && !part_.empty() && part_.size() <= max_part_bytes_;
}

}  // namespace lookhaven::media
