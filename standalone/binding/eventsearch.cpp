// SPDX-License-Identifier: Apache-2.0
#include "platform/recording/eventsearch.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <filesystem>
#include <limits>
#include <map>
#include <span>
#include <string_view>
#include <tuple>
#include <vector>

#include "standalone/archive/recording_log.h"
#include "standalone/binding/camera_record.h"
#include "standalone/binding/event_record.h"
#include "standalone/binding/huge_pages.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"

namespace archive = lookhaven::archive;
namespace store = lookhaven::store;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

namespace {

constexpr int kFinishedOnly = 2;
constexpr std::size_t kMaxListedIds = 4096;

enum MapValue : int { kNothing = 0, kRecorded = 1, kEvent = 2 };

store::EventFilter FilterOf(const EventFilterParam& asked) {
    store::EventFilter filter;
    filter.camera_ids = asked.m_CamIds;
    const std::set<int> denied = lookhaven::binding::DeniedCameras(store::CameraAccess::kPlayback);
    std::erase_if(filter.camera_ids, [&denied](int id) { return denied.contains(id); });
    filter.mount_id = asked.m_MountId;
    filter.begin_s = asked.m_BeginTm;
    filter.end_s = asked.m_EndTm;
    filter.reason = asked.m_Reason;
    filter.finished_only = asked.m_RecordingState == kFinishedOnly;
    filter.offset = std::max(asked.m_Offset, 0);
    return filter;
}

// Whether any of the bytes is not 0, looked at eight at once.
bool HasAny(const unsigned char* begin, const unsigned char* end) {
    std::uint64_t any = 0;
    for (; end - begin >= 8 && any == 0; begin += 8) {
        std::memcpy(&any, begin, 8);
    }
    return any != 0 || std::any_of(begin, end, [](unsigned char byte) { return byte != 0; });
}

int ValueOf(const unsigned char* recorded, const unsigned char* covered, int begin, int end) {
    return HasAny(covered + begin, covered + end)     ? kEvent
           : HasAny(recorded + begin, recorded + end) ? kRecorded
                                                      : kNothing;
}

// By start and id, as Events::List; the nodes are moved, not the events.
void SortByStart(std::list<Event>& events) {
    std::vector<std::tuple<int, int, std::list<Event>::iterator>> order;
    order.reserve(events.size());
    for (auto event = events.begin(); event != events.end(); ++event) {
        order.emplace_back(event->m_StartTm, event->m_Id, event);
    }
    std::ranges::sort(order, {}, [](const auto& each) { return std::pair(std::get<0>(each), std::get<1>(each)); });
    for (const auto& [start, id, event] : order) {
        events.splice(events.end(), events, event);
    }
}

// Each host has only the recording logs of its own mounts. What the rows tell is the same on all hosts.
int ReadRows(const std::string& camera, std::int64_t from_s, std::span<std::uint8_t> seconds) {
    const std::int64_t to_s = from_s + static_cast<std::int64_t>(seconds.size());
    std::ranges::fill(seconds, std::uint8_t{0});
    const store::EventFilter filter{.camera_ids = lookhaven::binding::IdSet(camera), .begin_s = from_s, .end_s = to_s};
    store::Events(RequestContext::Current().Records()).Visit(filter, [&](const store::Event& event) {
        const auto begin = static_cast<std::size_t>(std::max(event.start_s, from_s) - from_s);
        const auto end = static_cast<std::size_t>(std::clamp(event.end_s, from_s, to_s) - from_s);
        if (begin < end) {
            std::ranges::fill(seconds.subspan(begin, end - begin), static_cast<std::uint8_t>(event.reason));
        }
    });
    return 0;
}

std::string_view Trim(std::string_view text) {
    const std::size_t begin = std::min(text.find_first_not_of(" \t"), text.size());
    return text.substr(begin, text.find_last_not_of(" \t") + 1 - begin);
}

}  // namespace

EventFilterParam::EventFilterParam()
    : m_MountId(0),
      m_Offset(0),
      m_BeginTm(0),
      m_EndTm(std::numeric_limits<std::int64_t>::max()),
      m_Reason(0),
      m_RecordingState(0),
      m_CamVdoType(0) {}

int EventListGetAll(std::list<Event>& events, EventFilterParam& filter) {
    RequestContext& context = RequestContext::Current();
    lookhaven::binding::PrepareForManyObjects();
    std::map<int, std::string> mount_paths;
    for (const store::Mount& mount : context.Mounts()) {
        mount_paths[mount.id] = mount.path;
    }
    const store::EventFilter asked = FilterOf(filter);
    std::list<Event> found;
    store::Events(context.Records()).Visit(asked, [&](const store::Event& event) {
        found.push_back(lookhaven::binding::PlatformEvent(event, mount_paths[event.mount_id]));
    });
    if (asked.camera_ids.size() > 1) {
        SortByStart(found);
    }
    const auto skipped = std::min<std::size_t>(static_cast<std::size_t>(asked.offset), found.size());
    events.splice(events.end(), found, std::next(found.begin(), static_cast<std::ptrdiff_t>(skipped)), found.end());
    return 0;
}

// The camera may have recorded to other mounts before; its recording logs there count too.
int ReadRecLog(const std::string& storagePath, long from, int duration, unsigned char* buffer) {
    return OrFailure("ReadRecLog", -1, [&] {
        const std::filesystem::path asked(storagePath);
        const std::vector<store::Mount>& mounts = RequestContext::Current().Mounts();
        if (duration <= 0 || std::ranges::none_of(mounts, [&](const store::Mount& mount) {
                return asked.parent_path() == mount.path;
            })) {
            return -1;
        }
        const std::span<std::uint8_t> seconds(buffer, static_cast<std::size_t>(duration));
        if (RequestContext::Current().Installation().HostId() != 0) {
            return ReadRows(asked.filename(), from, seconds);
        }
        std::vector<std::uint8_t> more;
        bool read = false;
        for (const store::Mount& mount : mounts) {
            const std::filesystem::path folder = std::filesystem::path(mount.path) / asked.filename();
            if (!read) {
                read = archive::ReadRecordingLog(folder, from, seconds);
                continue;
            }
            more.resize(seconds.size());
            if (archive::ReadRecordingLog(folder, from, more)) {
                std::ranges::transform(seconds, more, seconds.begin(), std::ranges::max);
            }
        }
        return read ? 0 : -1;
    });
}

void FillRecLogMap(const unsigned char* recLog, const unsigned char* eventCoverage, int duration, int interval,
                   Json::Value& out) {
    const int step = std::max(interval, 1);
    out["interval"] = step;
    Json::Value& runs = out["runs"] = Json::arrayValue;
    int value = -1;
    int count = 0;
    const auto end_run = [&] {
        if (count > 0) {
            Json::Value& run = runs.append(Json::arrayValue);
            run.append(value);
            run.append(count);
        }
        count = 0;
    };
    for (int begin = 0; begin < duration;) {
        const int end = begin + std::min(step, duration - begin);
        const int next = ValueOf(recLog, eventCoverage, begin, end);
        if (next != value) {
            end_run();
            value = next;
        }
        ++count;
        begin = end;
    }
    end_run();
}

std::list<int> String2IntList(const std::string& text, const std::string& delimiter) {
    std::list<int> numbers;
    std::string_view rest = text;
    while (!rest.empty() && numbers.size() < kMaxListedIds) {
        const std::size_t end = std::min(delimiter.empty() ? rest.npos : rest.find(delimiter), rest.size());
        const std::string_view word = Trim(rest.substr(0, end));
        int number = 0;
        const auto [after, error] = std::from_chars(word.data(), word.data() + word.size(), number);
        if (error == std::errc() && after == word.data() + word.size()) {
            numbers.push_back(number);
        }
        rest.remove_prefix(std::min(end + delimiter.size(), rest.size()));
    }
    return numbers;
}
