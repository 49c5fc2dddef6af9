// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/recording_log.h"

#include <algorithm>
#include <stdexcept>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"

namespace lookhaven::archive {

namespace {

constexpr std::int64_t kDaySeconds = 86'400;

// Calls day(path, offset, first, count) for each UTC day of [begin_s, end_s): count seconds from offset within the day,
// which begin "first" seconds after begin_s.
template <class Day>
void ForEachDay(const std::filesystem::path& camera_folder, std::int64_t begin_s, std::int64_t end_s, Day day) {
    for (std::int64_t at = std::max<std::int64_t>(begin_s, 0); at < end_s;) {
        const std::int64_t offset = at % kDaySeconds;
        const std::int64_t count = std::min(kDaySeconds - offset, end_s - at);
        day(camera_folder / DayOf(at) / "seconds", offset, static_cast<std::size_t>(at - begin_s),
            static_cast<std::size_t>(count));
        at += count;
    }
}

}  // namespace

void WriteRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s, std::int64_t end_s,
                       std::uint8_t reason) {
    if (end_s - begin_s > kDaySeconds) {
        throw std::logic_error("more than a day of recording log at once");
    }
    const auto write = [&](const std::filesystem::path& path, std::int64_t offset, std::size_t, std::size_t count) {
        const base::FileDescriptor log = OpenFileInNewDay(path, O_WRONLY | O_CREAT, 0600);
        const std::vector<std::uint8_t> bytes(count, reason);
        if (!base::WriteAllAt(log.Get(), bytes.data(), bytes.size(), static_cast<std::uint64_t>(offset))) {
            base::ThrowErrno("cannot write " + path.string());
        }
        // Readers take missing bytes at the end for zeros; the full size is for people who look at the file.
        if (::lseek(log.Get(), 0, SEEK_END) < kDaySeconds && ::ftruncate(log.Get(), kDaySeconds) != 0) {
            base::ThrowErrno("cannot write " + path.string());
        }
    };
    ForEachDay(camera_folder, begin_s, end_s, write);
}

bool ReadRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s,
                      std::span<std::uint8_t> seconds) {
    std::error_code ignored;
    if (!std::filesystem::is_directory(camera_folder, ignored)) {
        return false;
    }
    std::fill(seconds.begin(), seconds.end(), std::uint8_t{0});
    const auto read = [&](const std::filesystem::path& path, std::int64_t offset, std::size_t first,
                          std::size_t count) {
        try {
            const base::FileDescriptor log = OpenFile(path, O_RDONLY);
            base::ReadAllAt(log.Get(), &seconds[first], count, static_cast<std::uint64_t>(offset));
        } catch (const std::system_error&) {
            return;  // nothing was recorded on that day
        }
    };
    ForEachDay(camera_folder, begin_s, begin_s + static_cast<std::int64_t>(seconds.size()), read);
    return true;
}

}  // namespace lookhaven::archive
