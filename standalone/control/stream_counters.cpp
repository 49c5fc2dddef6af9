// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/stream_counters.h"

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
    std::atomic<std::uint64_t> queue_capacity_bytes;
    std::atomic<std::int64_t> written_us;
    std::atomic<std::int64_t> stored_us;

    void Store(const StreamCounters& from) {
        stream = (std::int64_t{from.stream.camera} << 32) | static_cast<std::uint32_t>(from.stream.stream);
        pictures = from.pictures;
        bytes = from.bytes;
        pictures_per_second = from.pictures_per_second;
        bytes_per_second = from.bytes_per_second;
        connections = from.connections;
        last_picture_us = from.last_picture_us;
        is_recorded = from.is_recorded;
        dropped_pictures = from.dropped_pictures;
        queued_bytes = from.queued_bytes;
        queue_capacity_bytes = from.queue_capacity_bytes;
        written_us = from.written_us;
        stored_us = from.stored_us;
    }

    StreamCounters Load() const {
        const std::int64_t both = stream;
        return {.stream = {static_cast<std::int32_t>(both >> 32), static_cast<std::int32_t>(both)},
                .pictures = pictures,
                .bytes = bytes,
                .pictures_per_second = pictures_per_second,
                .bytes_per_second = bytes_per_second,
                .connections = connections,
                .last_picture_us = last_picture_us,
                .is_recorded = is_recorded,
                .dropped_pictures = dropped_pictures,
                .queued_bytes = queued_bytes,
                .queue_capacity_bytes = queue_capacity_bytes,
                .written_us = written_us,
                .stored_us = stored_us};
    }
};

}  // namespace

struct StreamCountersWriter::Table : CounterTable<Row, kMaxStreams, kVersion> {};

StreamCountersWriter::StreamCountersWriter(const base::Installation& installation) : table_(PathOf(installation)) {}

void StreamCountersWriter::Write(const std::vector<StreamCounters>& streams) {
    table_.Write(streams);
}

std::optional<std::vector<StreamCounters>> ReadStreamCounters(const base::Installation& installation) {
    return StreamCountersWriter::Table::Read<StreamCountersWriter::Table>(PathOf(installation));
}

}  // namespace lookhaven::control
