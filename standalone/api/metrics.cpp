// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/metrics.h"

#include <algorithm>
#include <chrono>
#include <fstream>
#include <map>
#include <optional>
#include <sstream>
#include <vector>

#include <unistd.h>

#include "standalone/api/health.h"
#include "standalone/api/metrics_text.h"
#include "standalone/api/mount_metrics.h"
#include "standalone/api/store_metrics.h"
#include "standalone/base/clock.h"
#include "standalone/base/process.h"
#include "standalone/control/common_config.h"
#include "standalone/control/stream_counters.h"
#include "standalone/ring/inventory.h"

namespace lookhaven::api {

namespace {

using Streams = std::vector<control::StreamCounters>;

// A family with a sample for each stream, or for each recorded one.
template <typename Value>
void AddStreams(MetricsText& text, const Streams& streams, const char* name, const char* type, const char* help,
                bool recorded_only, Value value) {
    text.Family(name, type, help);
    for (const control::StreamCounters& each : streams) {
        if (each.is_recorded || !recorded_only) {
            text.Sample(value(each), {{"camera", std::to_string(each.stream.camera)},
                                      {"stream", std::to_string(each.stream.stream)}});
        }
    }
}

// Those that run for long: request processes are started and ended all the time.
void AddUptimes(MetricsText& text, const base::Installation& installation) {
    text.Family("lookhaven_process_uptime_seconds", "gauge", "For how long the process has run.");
    const pid_t host = ::getppid();  // of this request's process
    const auto add = [&](const char* name, const base::ProcessIdentity& process) {
        if (const std::int64_t started_s = base::StartedAt(process); started_s != 0) {
            text.Sample(static_cast<double>(base::WallSeconds() - started_s), {{"process", name}});
        }
    };
    if (const auto recorder = control::RecorderProcess(installation)) {
        add("recorder", *recorder);
    }
    add("webapi", {host, base::ProcessStartTicks(host)});
}

void AddRecorder(MetricsText& text, const base::Installation& installation) {
    const bool is_alive = control::FindRecorder(installation) == control::RecorderState::kAlive;
    text.Family("lookhaven_recorder_up", "gauge", "Whether the recorder runs and does not hang.");
    text.Sample(is_alive ? 1 : 0);
    const Streams streams = is_alive ? control::ReadStreamCounters(installation).value_or(Streams()) : Streams();
    const double now_us = static_cast<double>(base::MonotonicMicros());
    using Counters = control::StreamCounters;
    AddStreams(text, streams, "lookhaven_stream_up", "gauge", "Whether a picture came within the last ten seconds.",
               false, [&](const Counters& each) {
                   const double age_us = now_us - static_cast<double>(each.last_picture_us);
                   return each.pictures > 0 && age_us <= kMaxPictureAgeUs ? 1 : 0;
               });
    text.Family("lookhaven_stream_picture_age_seconds", "gauge", "How long ago the newest picture came.");
    for (const Counters& each : streams) {
        if (each.pictures > 0) {
            text.Sample(
                (now_us - static_cast<double>(each.last_picture_us)) / 1e6,
                {{"camera", std::to_string(each.stream.camera)}, {"stream", std::to_string(each.stream.stream)}});
        }
    }
    AddStreams(text, streams, "lookhaven_stream_pictures_total", "counter", "Pictures that came from the camera.",
               false, [](const Counters& each) { return static_cast<double>(each.pictures); });
    AddStreams(text, streams, "lookhaven_stream_bytes_total", "counter", "Bytes of pictures and sound that came.",
               false, [](const Counters& each) { return static_cast<double>(each.bytes); });
    AddStreams(text, streams, "lookhaven_stream_connections_total", "counter", "Attempts to reach the camera.", false,
               [](const Counters& each) { return static_cast<double>(each.connections); });
    AddStreams(text, streams, "lookhaven_recording_dropped_pictures_total", "counter",
               "Pictures that were not recorded because the disk was too slow.", true,
               [](const Counters& each) { return static_cast<double>(each.dropped_pictures); });
    AddStreams(text, streams, "lookhaven_recording_queue_bytes", "gauge", "Bytes that wait for the disk.", true,
               [](const Counters& each) { return static_cast<double>(each.queued_bytes); });
    AddStreams(text, streams, "lookhaven_recording_queue_limit_bytes", "gauge",
               "How much may wait before pictures are dropped.", true,
               [](const Counters& each) { return static_cast<double>(each.queue_capacity_bytes); });
    AddStreams(text, streams, "lookhaven_recording_lag_seconds", "gauge",
               "How old the newest picture is that the disk has, but for half a second.", true,
               [&](const Counters& each) { return (now_us - static_cast<double>(each.written_us)) / 1e6; });
    text.Family("lookhaven_recording_store_lag_seconds", "gauge",
                "How long ago the record store had the rows of all that was recorded.");
    if (const auto each = std::ranges::find(streams, true, &Counters::is_recorded); each != streams.end()) {
        text.Sample((now_us - static_cast<double>(each->stored_us)) / 1e6);
    }
}

// The shared memory between the recorder and viewers.
void AddRings(MetricsText& text, const base::Installation& installation) {
    std::vector<ring::SegmentState> rings = ring::ListSegments(installation);
    std::erase_if(rings, [](const ring::SegmentState& each) { return !each.writer_alive; });
    const auto add = [&](const char* name, const char* type, const char* help, auto field) {
        text.Family(name, type, help);
        for (const ring::SegmentState& each : rings) {
            text.Sample(static_cast<double>(each.*field),
                        {{"camera", std::to_string(each.id.camera)},
                         {"stream", std::to_string(each.id.stream)},
                         {"medium", each.id.medium == base::Medium::kVideo ? "video" : "audio"}});
        }
    };
    using State = ring::SegmentState;
    add("lookhaven_ring_size_bytes", "gauge", "Capacity of the ring between the recorder and viewers.",
        &State::arena_bytes);
    add("lookhaven_ring_used_bytes", "gauge", "Bytes that its frames take.", &State::used_bytes);
    add("lookhaven_ring_readers", "gauge", "Viewers that read the ring.", &State::readers);
    add("lookhaven_ring_dropped_frames_total", "counter",
        "Frames that had no room beside what viewers read, or came before a key frame.", &State::entries_dropped);
}

// "VEXO.Event/List": the API's name, and the method's where it is known.
std::pair<std::string, std::string> SplitCall(const std::string& call) {
    const std::size_t slash = call.find('/');
    return slash == call.npos ? std::pair(call, std::string())
                              : std::pair(call.substr(0, slash), call.substr(slash + 1));
}

void AddDurations(MetricsText& text, const http::RequestCounters& counters) {
    text.Family("lookhaven_request_duration_seconds", "histogram",
                "From the start of a request's process to its end, without streams.");
    for (const auto& [call, counted] : counters.Calls()) {
        const auto [api, method] = SplitCall(call);
        std::uint64_t count = 0;
        for (std::size_t i = 0; i < counted.durations.counts.size(); ++i) {
            count += counted.durations.counts[i];
            std::ostringstream bound;
            i < http::RequestCounters::kBounds.size() ? bound << http::RequestCounters::kBounds[i] : bound << "+Inf";
            text.Sample(static_cast<double>(count), {{"api", api}, {"method", method}, {"le", bound.str()}}, "_bucket");
        }
        text.Sample(counted.durations.sum_s, {{"api", api}, {"method", method}}, "_sum");
        text.Sample(static_cast<double>(count), {{"api", api}, {"method", method}}, "_count");
    }
}

void AddRequests(MetricsText& text, const http::RequestCounters& counters) {
    text.Family("lookhaven_requests_total", "counter", "Requests by the status of their answer, or \"crash\".");
    for (const auto& [call, counted] : counters.Calls()) {
        const auto [api, method] = SplitCall(call);
        for (const auto& [status, count] : counted.by_status) {
            text.Sample(static_cast<double>(count),
                        {{"api", api}, {"method", method}, {"code", status == 0 ? "crash" : std::to_string(status)}});
        }
    }
    text.Family("lookhaven_refused_requests_total", "counter", "Requests refused before they had a process.");
    for (const auto& [status, count] : counters.Refused()) {
        text.Sample(static_cast<double>(count), {{"code", std::to_string(status)}});
    }
    AddDurations(text, counters);
}

// Kibibytes that only this process has; 0 once it is gone.
std::int64_t PrivateKib(pid_t pid) {
    std::ifstream rollup("/proc/" + std::to_string(pid) + "/smaps_rollup");
    std::int64_t sum = 0;
    for (std::string line; std::getline(rollup, line);) {
        if (line.starts_with("Private_Clean:") || line.starts_with("Private_Dirty:")) {
            sum += std::strtoll(line.c_str() + line.find(':') + 1, nullptr, 10);
        }
    }
    return sum;
}

void AddViewers(MetricsText& text, const control::SlotTable& slots) {
    struct Kind {
        int viewers = 0;
        std::int64_t private_kib = 0;
    };
    std::map<std::string, Kind, std::less<>> kinds;
    int others = 0;
    slots.VisitRunning([&](const control::Slot& slot) {
        if (slot.is_stream) {
            Kind& kind = kinds[std::string(control::CallOf(slot))];
            ++kind.viewers;
            kind.private_kib += PrivateKib(slot.pid);
        } else {
            ++others;
        }
    });
    text.Family("lookhaven_viewers", "gauge", "Streams that run.");
    for (const auto& [call, kind] : kinds) {
        text.Sample(kind.viewers, {{"api", SplitCall(call).first}, {"method", SplitCall(call).second}});
    }
    text.Family("lookhaven_viewers_private_bytes", "gauge", "Memory that their processes do not share.");
    for (const auto& [call, kind] : kinds) {
        text.Sample(static_cast<double>(kind.private_kib) * 1024,
                    {{"api", SplitCall(call).first}, {"method", SplitCall(call).second}});
    }
    text.Family("lookhaven_running_requests", "gauge", "Running requests other than streams, including this one.");
    text.Sample(others);
}

}  // namespace

std::string MetricsOf(const Call& call, store::Store* records) {
    MetricsText text;
    const base::Installation& installation = call.context.Installation();
    AddRecorder(text, installation);
    AddRings(text, installation);
    AddUptimes(text, installation);
    AddStore(text, records);
    try {
        if (records != nullptr) {
            AddMounts(text, installation, *records);
            AddHosts(text, installation, *records);
        }
    } catch (const store::StoreError&) {
        // lookhaven_store_up tells it
    }
    AddRequests(text, call.counters);
    AddViewers(text, call.slots);
    return text.Text();
}

}  // namespace lookhaven::api
