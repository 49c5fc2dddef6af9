// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/ebml_reader.h"

#include <algorithm>
#include <bit>

#include <sys/stat.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"

namespace lookhaven::archive {

std::optional<EbmlNumber> EbmlNumber::Parse(std::span<const std::uint8_t> bytes, std::size_t max_bytes) {
    if (bytes.empty() || bytes[0] == 0) {
        return std::nullopt;
    }
    EbmlNumber number;
    number.length = static_cast<std::size_t>(std::countl_zero(bytes[0])) + 1;
    if (number.length > max_bytes || number.length > bytes.size()) {
        return std::nullopt;
    }
    for (const std::uint8_t byte : bytes.first(number.length)) {
        number.with_marker = number.with_marker << 8 | byte;
    }
    number.value = number.with_marker & ((std::uint64_t{1} << (7 * number.length)) - 1);
    return number;
}

std::uint64_t EbmlReader::FileSize() const {
    struct stat status {};
    if (::fstat(file_, &status) != 0) {
        base::ThrowErrno("cannot read a recording");
    }
    return static_cast<std::uint64_t>(status.st_size);
}

std::span<const std::uint8_t> EbmlReader::Bytes(std::uint64_t at, std::size_t count) {
    constexpr std::size_t kWindowBytes = 4096;
    if (at < window_at_ || at + count > window_at_ + window_.size()) {
        window_.resize(std::max(kWindowBytes, count));
        const std::optional<std::size_t> got = base::ReadAllAt(file_, window_.data(), window_.size(), at);
        if (!got) {
            window_.clear();
            base::ThrowErrno("cannot read a recording");
        }
        window_.resize(*got);
        window_at_ = at;
    }
    const std::span<const std::uint8_t> rest = std::span(window_).subspan(static_cast<std::size_t>(at - window_at_));
    return rest.first(std::min(count, rest.size()));
}

std::optional<EbmlReader::Element> EbmlReader::ReadElementHead(std::uint64_t at) {
    const std::span<const std::uint8_t> head = Bytes(at, 12);
    const auto id = EbmlNumber::Parse(head, 4);
    const auto size = id ? EbmlNumber::Parse(head.subspan(id->length), 8) : std::nullopt;
    if (!size) {
        return std::nullopt;
    }
    const std::uint64_t data = at + id->length + size->length;
    return Element{static_cast<std::uint32_t>(id->with_marker), data, data + size->value, size->IsUnknown()};
}

std::optional<EbmlReader::Element> EbmlReader::ReadElement(std::uint64_t at, std::uint64_t end) {
    const std::optional<Element> element = at < end ? ReadElementHead(at) : std::nullopt;
    return element && !element->is_endless && element->end <= end ? element : std::nullopt;
}

std::uint64_t EbmlReader::Unsigned(const Element& element) {
    std::uint64_t number = 0;
    for (const std::uint8_t byte : Bytes(element.data, element.SizeUpTo(8))) {
        number = number << 8 | byte;
    }
    return number;
}

std::string EbmlReader::Text(const Element& element) {
    const auto bytes = Bytes(element.data, element.SizeUpTo(64));
    return {bytes.begin(), std::find(bytes.begin(), bytes.end(), 0)};
}

}  // namespace lookhaven::archive
