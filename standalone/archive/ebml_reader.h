// SPDX-License-Identifier: Apache-2.0
//
// Walks the elements of an EBML file, of which Matroska is one, without reading what it is not asked for.
//
// Invariants    No contents make this read outside the file, loop forever or allocate without bound.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace lookhaven::archive {

// The leading zeros of its first byte say how many bytes follow.
struct EbmlNumber {
    std::uint64_t with_marker = 0;
    std::uint64_t value = 0;
    std::size_t length = 0;

    // The number at the beginning; nothing when it is cut or takes more than max_bytes.
    static std::optional<EbmlNumber> Parse(std::span<const std::uint8_t> bytes, std::size_t max_bytes);
    bool IsUnknown() const { return value == (std::uint64_t{1} << (7 * length)) - 1; }
};

// All but Forget throw std::system_error.
class EbmlReader {
  public:
    // Offsets in the file.
    struct Element {
        std::uint32_t id = 0;
        std::uint64_t data = 0;
        std::uint64_t end = 0;
        bool is_endless = false;  // of unknown size

        std::uint64_t Size() const { return end - data; }
        std::size_t SizeUpTo(std::size_t max_bytes) const {
            return static_cast<std::size_t>(std::min<std::uint64_t>(Size(), max_bytes));
        }
    };

    // Borrows the descriptor.
    explicit EbmlReader(int file) : file_(file) {}

    std::uint64_t FileSize() const;
    // At most count bytes of the file; fewer at its end. Valid until the next call of anything here.
    std::span<const std::uint8_t> Bytes(std::uint64_t at, std::size_t count);
    // The element whose header begins at the position, even if it does not end inside the file.
    std::optional<Element> ReadElementHead(std::uint64_t at);
    // The element that begins at the position, if all of it is before the end.
    std::optional<Element> ReadElement(std::uint64_t at, std::uint64_t end);
    // False when the children do not fill the parent exactly, or a visit says so.
    template <class Visit>
    bool ForEachChild(const Element& parent, Visit visit) {
        for (std::uint64_t at = parent.data; at < parent.end;) {
            const std::optional<Element> child = ReadElement(at, parent.end);
            if (!child || !visit(*child)) {
                return false;
            }
            at = child->end;
        }
        return true;
    }
    // The number in the first eight bytes.
    std::uint64_t Unsigned(const Element& element);
    // The text in the first 64 bytes, up to a zero byte.
    std::string Text(const Element& element);
    // Reads again what may have changed since.
    void Forget() { window_.clear(); }

  private:
    int file_;
    std::vector<std::uint8_t> window_;  // a piece of the file, read last
    std::uint64_t window_at_ = 0;
};

}  // namespace lookhaven::archive
