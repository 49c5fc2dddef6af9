// SPDX-License-Identifier: Apache-2.0
//
// Reads any seconds of a recording log of any bytes: what the file does not hold is zeros.
#include "standalone/archive/recording_log.h"

#include <vector>

#include "standalone/archive/layout.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    constexpr std::int32_t kDaySeconds = 86'400;
    fuzz::Input input(data, size);
    const auto begin_s = input.Take<std::int32_t>();
    std::vector<std::uint8_t> seconds(input.Take<std::uint16_t>(), 0xff);
    const std::span<const std::uint8_t> log = input.Rest();
    const std::filesystem::path day = folder / archive::DayOf(std::max(begin_s, 0));
    std::filesystem::create_directory(day);
    fuzz::WriteFile(day / "seconds", log);
    fuzz::Require(archive::ReadRecordingLog(folder, begin_s, seconds));
    for (std::size_t i = 0; i < seconds.size(); ++i) {
        const std::int64_t second = begin_s + static_cast<std::int64_t>(i);
        const bool is_this_day = second >= 0 && second / kDaySeconds == std::max(begin_s, 0) / kDaySeconds;
        const auto offset = static_cast<std::size_t>(second % kDaySeconds);
        fuzz::Require(seconds[i] == (is_this_day && offset < log.size() ? log[offset] : 0));
    }
    std::filesystem::remove_all(day);
    return 0;
}
