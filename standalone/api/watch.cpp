// SPDX-License-Identifier: Apache-2.0
//
// Why so        A watch costs nothing while nothing happens: it sleeps on a word that the watcher of sessions changes
//               when the store has a new mark, whichever host reported it. Where nobody changes it, the store is asked
//               with each heartbeat.
// Invariants    (1) The rights of the caller are asked for with each mark, as of then. What is hidden from the caller
//                   moves no id that is sent.
//               (2) The store is closed while something is sent or waited for.
//               (3) No more than a page of marks is held, however slow the client reads: one that takes no byte for
//                   30 seconds is left.
#include "standalone/api/watch.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <limits>
#include <optional>
#include <string_view>

#include "standalone/api/event_json.h"
#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/base/json_text.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxWatchesOfUser = 16;
constexpr std::chrono::seconds kHeartbeat{15};
constexpr std::int64_t kMaxBacklogAgeSeconds = 86'400;
constexpr int kMaxBacklog = 1'000;
constexpr int kMarksPage = 20;  // of up to 8 KiB of text each
constexpr int kReportsPage = 1'000;

// Where a client stands: the last mark that it received, 0 for none, and when.
struct Place {
    int mark = 0;
    std::int64_t told_s = 0;

    std::string Text() const { return std::to_string(mark) + '-' + std::to_string(told_s); }
};

std::optional<Place> PlaceOf(const Call& call) {
    const Json::Value& after = call.Parameter("after");
    const std::string text = after.isNull() ? std::string(call.request.Header("HTTP_LAST_EVENT_ID")) : after.asString();
    if (text.empty()) {
        return std::nullopt;
    }
    Place place;
    const char* const end = text.data() + text.size();
    const auto mark = std::from_chars(text.data(), end, place.mark);
    const bool has_time = mark.ec == std::errc() && mark.ptr != end && *mark.ptr == '-';
    const auto time = has_time ? std::from_chars(mark.ptr + 1, end, place.told_s) : mark;
    if (!has_time || place.mark < 0 || time.ec != std::errc() || time.ptr != end) {
        throw Failure(400, "after is no id of an event of this stream");
    }
    return place;
}

// The marks after a given one.
struct Backlog {
    int last = 0;    // the newest mark, even if the caller may not see it
    int missed = 0;  // how many the caller may see, …
    int newest = 0;  // … of these the last …
    int oldest = 0;  // … and the first
};

// Goes back from the newest mark until more than max are found, or what was reported before since_s.
Backlog LookBack(store::Marks& marks, int after, int max, std::int64_t since_s) {
    Backlog found{.last = after};
    for (int before = std::numeric_limits<int>::max();;) {
        const std::vector<store::Marks::Report> reports = marks.ReportsBetween(after, before, kReportsPage);
        for (const store::Marks::Report& report : reports) {
            found.last = std::max(found.last, report.id);
            if (report.reported_s < since_s || found.missed > max) {
                return found;
            }
            if (IsVisible(report)) {
                found.newest = std::max(found.newest, report.id);
                found.oldest = report.id;
                ++found.missed;
            }
        }
        if (reports.size() < kReportsPage) {
            return found;
        }
        before = reports.back().id;
    }
}

std::string EventText(const char* name, const Place& place, const Json::Value& data) {
    return std::string("event: ") + name + "\nid: " + place.Text() + "\ndata: " + base::OneLineJson(data) + "\n\n";
}

// Whether the caller can have received that mark: it may see it, or a later one. An id beyond comes from before the
// store was restored from a backup. The result must not reveal whether a hidden mark exists.
bool MayHaveSeen(store::Marks& marks, int id, int newest_visible) {
    if (id <= newest_visible) {
        return true;
    }
    return std::ranges::any_of(store::MarkKindNames(), [&](const auto& kind) {
        const auto mark = marks.Find(kind.second, id);
        return mark && IsVisible(*mark);
    });
}

bool Send(const Call& call, std::string text) {
    iovec piece{text.data(), text.size()};
    return call.context.output()->Send({&piece, 1});
}

using Clock = std::chrono::steady_clock;

struct Progress {
    Place place;     // of the last event
    int cursor = 0;  // the mark behind which those follow that are to be told
    Clock::time_point sent = Clock::now();
};

struct Start {
    std::string event;
    Progress progress;
};

Start StartOf(const Call& call) {
    const std::int64_t now_s = base::WallSeconds();
    const std::int64_t since_s = now_s - kMaxBacklogAgeSeconds;
    store::Marks marks(call.Records());
    const std::optional<Place> asked = PlaceOf(call);
    Backlog backlog = LookBack(marks, 0, 0, since_s);
    backlog.missed = 0;
    bool is_resumed = asked && asked->told_s > since_s && asked->told_s <= now_s + 60 &&
                      MayHaveSeen(marks, asked->mark, backlog.newest);
    if (is_resumed) {
        const Backlog missed = LookBack(marks, asked->mark, kMaxBacklog, since_s);
        is_resumed = missed.missed <= kMaxBacklog;
        backlog = is_resumed ? missed : backlog;
    }
    Json::Value data;
    data["resumed"] = is_resumed;
    data["missed"] = backlog.missed;
    data["time"] = Json::Int64{now_s};
    const Place place{is_resumed ? asked->mark : backlog.newest, now_s};
    return {EventText("start", place, data), {place, backlog.missed > 0 ? backlog.oldest - 1 : backlog.last}};
}

// Tells what was reported since.
void TellReported(const Call& call, Progress& progress) {
    for (bool is_all = false; !is_all && !call.slot.MustEnd();) {
        std::string text;
        const std::vector<store::Mark> reported =
            store::Marks(call.Records()).ReportedAfter(progress.cursor, kMarksPage);
        for (const store::Mark& mark : reported) {
            progress.cursor = mark.id;
            if (IsVisible(mark)) {
                progress.place = {mark.id, base::WallSeconds()};
                text += EventText("mark", progress.place, Describe(mark));
            }
        }
        is_all = reported.size() < kMarksPage;
        call.context.CloseRecords();
        if (!text.empty()) {
            progress.sent = Clock::now();
            if (!Send(call, std::move(text))) {
                return;
            }
        }
    }
}

// Due by what was sent alone: what else wakes a watch may be hidden from its caller.
void SendHeartbeat(const Call& call, Progress& progress) {
    if (Clock::now() - progress.sent < kHeartbeat) {
        return;
    }
    progress.place.told_s = base::WallSeconds();
    progress.sent = Clock::now();
    Send(call, EventText("alive", progress.place, Json::objectValue));
}

}  // namespace

std::string Watch(const Call& call) {
    const std::atomic<std::uint32_t>& reports = call.slots.Reports();
    std::uint32_t seen = reports;
    auto [event, progress] = StartOf(call);
    if (!call.slots.BeginWatch(call.slot, kMaxWatchesOfUser)) {
        throw Failure(503, "this account watches for events in too many places", http::kRetrySoonSeconds);
    }
    call.context.NoteStream();
    call.context.CloseRecords();
    Send(call, "Status: 200 OK\r\nContent-Type: text/event-stream\r\nCache-Control: no-store\r\n\r\n" + event);
    while (!call.context.output()->IsBroken() && !call.slot.MustEnd()) {
        TellReported(call, progress);
        SendHeartbeat(call, progress);
        const auto rest = progress.sent + kHeartbeat - Clock::now();
        base::SleepWhile(reports, seen, std::chrono::ceil<std::chrono::microseconds>(rest));
        seen = reports;
    }
    return "";
}

}  // namespace lookhaven::api
