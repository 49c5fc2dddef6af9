// SPDX-License-Identifier: Apache-2.0
//
// Format        The configurations are those of ISO 14496-15: of H.264 five bytes, then the sequence and the picture
//               parameter sets; of H.265 22 bytes, then arrays of units of one type. Numbers are big endian.
#include "standalone/media/stored_video.h"

#include <array>
#include <optional>

namespace lookhaven::media {

namespace {

constexpr std::array<std::uint8_t, 4> kStartCode{0, 0, 0, 1};

// Takes numbers and bytes from the front; nothing once there are too few.
class Bytes {
  public:
    explicit Bytes(std::span<const std::uint8_t> bytes) : rest_(bytes) {}

    bool IsEmpty() const { return rest_.empty(); }
    std::optional<std::size_t> Number(std::size_t length) {
        const auto bytes = Take(length);
        std::size_t number = 0;
        for (const std::uint8_t byte : bytes.value_or(std::span<const std::uint8_t>())) {
            number = number << 8 | byte;
        }
        return bytes ? std::optional(number) : std::nullopt;
    }
    std::optional<std::span<const std::uint8_t>> Take(std::size_t count) {
        if (count > rest_.size()) {
            return std::nullopt;
        }
        const auto taken = rest_.first(count);
        rest_ = rest_.subspan(count);
        return taken;
    }

  private:
    std::span<const std::uint8_t> rest_;
};

void AppendUnit(std::vector<std::uint8_t>& annexb, std::span<const std::uint8_t> unit) {
    annexb.insert(annexb.end(), kStartCode.begin(), kStartCode.end());
    annexb.insert(annexb.end(), unit.begin(), unit.end());
}

// So many units behind lengths of that size. False when there are fewer.
bool AppendUnits(Bytes& bytes, std::size_t count, std::size_t length_bytes, std::vector<std::uint8_t>& annexb) {
    for (std::size_t i = 0; i < count; ++i) {
        const auto length = bytes.Number(length_bytes);
        const auto unit = length ? bytes.Take(*length) : std::nullopt;
        if (!unit) {
            return false;
        }
        AppendUnit(annexb, *unit);
    }
    return true;
}

}  // namespace

StoredVideo::StoredVideo(Codec codec, std::span<const std::uint8_t> configuration) : sets_(codec, {}) {
    if (configuration.empty() || configuration[0] != 1) {
        return;
    }
    if (codec == Codec::kH264) {
        ReadH264(configuration);
    } else {
        ReadH265(configuration);
    }
    sets_ = ParameterSets(codec, configured_);
}

void StoredVideo::ReadH264(std::span<const std::uint8_t> configuration) {
    if (configuration.size() < 6) {
        return;
    }
    length_bytes_ = (configuration[4] & 3U) + 1;
    Bytes bytes(configuration.subspan(5));
    const std::size_t sequence_sets = bytes.Number(1).value_or(0) & 31;
    if (AppendUnits(bytes, sequence_sets, 2, configured_)) {
        AppendUnits(bytes, bytes.Number(1).value_or(0), 2, configured_);
    }
}

void StoredVideo::ReadH265(std::span<const std::uint8_t> configuration) {
    if (configuration.size() < 23) {
        return;
    }
    length_bytes_ = (configuration[21] & 3U) + 1;
    Bytes bytes(configuration.subspan(22));
    for (std::size_t arrays = bytes.Number(1).value_or(0); arrays > 0; --arrays) {
        bytes.Number(1);  // the type of the units
        if (!AppendUnits(bytes, bytes.Number(2).value_or(0), 2, configured_)) {
            return;
        }
    }
}

std::span<const std::uint8_t> StoredVideo::ToAnnexB(std::span<const std::uint8_t> frame, bool is_key) {
    std::span<const std::uint8_t> converted = frame;
    if (length_bytes_ > 0) {
        converted_.clear();
        for (Bytes bytes(frame); !bytes.IsEmpty();) {
            if (!AppendUnits(bytes, 1, length_bytes_, converted_)) {
                return {};
            }
        }
        converted = converted_;
    }
    return is_key ? sets_.Complete(converted) : converted;
}

}  // namespace lookhaven::media
