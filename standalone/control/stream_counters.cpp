// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/stream_counters.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <filesystem>

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kVersion = 0x6c68'7374'6304;  // with the layout
constexpr std::size_t kMaxStreams = 1024;

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "stream-counters";
}

struct Row {
    std::atomic<std::int64_t> stream;
    std::atomic<std::uint64_t> pictures;
    std::atomic<std::uint64_t> bytes;
    std::atomic<double> pictures_per_second;
    std::atomic<double> bytes_per_second;
    std::atomic<std::uint64_t> connections;
    std::atomic<std::int64_t> last_picture_us;
    std::atomic<bool> is_recorded;
    std::atomic<std::uint64_t> dropped_pictures;
    std::atomic<std::uint64_t> queued_bytes;
    std::atomic<std::uint64_t> queue_bytes;
    std::atomic<std::int64_t> written_us;
    std::atomic<std::int64_t> stored_us;
};

void Store(Row& row, const StreamCounters& from) {
    row.stream = (std::int64_t{from.stream.camera} << 32) | static_cast<std::uint32_t>(from.stream.stream);
    row.pictures = from.pictures;
    row.bytes = from.bytes;
    row.pictures_per_second = from.pictures_per_second;
    row.bytes_per_second = from.bytes_per_second;
    row.connections = from.connections;
    row.last_picture_us = from.last_picture_us;
    row.is_recorded = from.is_recorded;
    row.dropped_pictures = from.dropped_pictures;
    row.queued_bytes = from.queued_bytes;
    row.queue_bytes = from.queue_bytes;
    row.written_us = from.written_us;
    row.stored_us = from.stored_us;
}

StreamCounters Load(const Row& row) {
    const std::int64_t stream = row.stream;
    return {.stream = {static_cast<std::int32_t>(stream >> 32), static_cast<std::int32_t>(stream)},
            .pictures = row.pictures,
            .bytes = row.bytes,
            .pictures_per_second = row.pictures_per_second,
            .bytes_per_second = row.bytes_per_second,
            .connections = row.connections,
            .last_picture_us = row.last_picture_us,
            .is_recorded = row.is_recorded,
            .dropped_pictures = row.dropped_pictures,
            .queued_bytes = row.queued_bytes,
            .queue_bytes = row.queue_bytes,
            .written_us = row.written_us,
            .stored_us = row.stored_us};
}

}  // namespace

struct StreamCountersWriter::Table {
    std::atomic<std::uint64_t> version;
    std::atomic<std::uint64_t> used;
    std::array<Row, kMaxStreams> rows;
};

StreamCountersWriter::StreamCountersWriter(const base::Installation& installation)
    : table_(MappedTable<Table>::Replace(PathOf(installation), [](Table& table) { table.version = kVersion; })) {}

void StreamCountersWriter::Write(const std::vector<StreamCounters>& streams) {
    const std::size_t count = std::min(streams.size(), kMaxStreams);
    for (std::size_t i = 0; i < count; ++i) {
        Store(table_->rows[i], streams[i]);
    }
    table_->used = count;
}

std::optional<std::vector<StreamCounters>> ReadStreamCounters(const base::Installation& installation) {
    const auto table = MappedTable<const StreamCountersWriter::Table>::Open(PathOf(installation));
    if (!table || (*table)->version != kVersion) {
        return std::nullopt;
    }
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>((*table)->used, kMaxStreams));
    std::vector<StreamCounters> streams;
    streams.reserve(count);
    std::transform((*table)->rows.begin(), (*table)->rows.begin() + static_cast<std::ptrdiff_t>(count),
                   std::back_inserter(streams), Load);
    return streams;
}

}  // namespace lookhaven::control
