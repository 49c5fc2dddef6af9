// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/marks.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/mark_row.h"
#include "standalone/store/row_search.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxPathBytes = 1024;
constexpr std::int64_t kSecondsPerDay = 86'400;

bool IsMarkText(std::string_view text) {
    if (text.size() > kMaxMarkTextBytes) {
        return false;
    }
    for (std::size_t begin = 0; begin <= text.size();) {
        const std::size_t end = std::min(text.find('\n', begin), text.size());
        if (!IsPlainText(text.substr(begin, end - begin), kMaxMarkTextBytes)) {
            return false;
        }
        begin = end + 1;
    }
    return true;
}

void RequireMark(const Mark& mark) {
    if (mark.kind != MarkKind::kAlert && mark.kind != MarkKind::kPos) {
        throw InvalidRecord("a mark is an alert or a POS transaction");
    }
    if (mark.start_s < 0 || mark.end_s < mark.start_s || mark.end_s - mark.start_s > kMaxFootageSeconds ||
        mark.end_s > kLastMoment) {
        throw InvalidRecord("a mark's time must be after 1970 and its length 0 to 3600 seconds");
    }
    if (!IsMarkText(mark.text)) {
        throw InvalidRecord("a mark's text is lines of UTF-8 without control characters, 8192 bytes at most");
    }
}

// Older ones that still wait count too: those of a mount whose disk is missing would grow without end. The command line
// reports as much as it likes.
void RequireWithin(soci::session& sql, std::int64_t max_per_day, const Reporter& reporter, std::int64_t now_s) {
    const std::int64_t since_s = now_s - kSecondsPerDay;
    const auto reported = FetchOne<std::int64_t>(
        sql,
        "select (select count(*) from marks where reporter_id = :user and reporter_id <> 0 and reported_s > :since)"
        " + (select count(*) from marks where state = 0 and reporter_id = :waiting and reporter_id <> 0"
        " and reported_s <= :before)",
        reporter.user_id, since_s, reporter.user_id, since_s);
    if (reported.value() >= max_per_day) {
        throw TooManyMarks();
    }
}

}  // namespace

const char* NameOf(MarkState state) {
    return state == MarkState::kSaved ? "saved" : state == MarkState::kMissed ? "missed" : "pending";
}

Mark Marks::Add(MarkKind kind, int camera_id, std::int64_t moment_s, std::int64_t length_s, const std::string& text,
                const Reporter& reporter, std::int64_t now_s, std::int64_t max_per_day) {
    if (moment_s < 0 || moment_s > kLastMoment || length_s < 0 || length_s > kMaxMarkSeconds) {
        throw InvalidRecord("a mark's time must be after 1970 and its length 0 to 3600 seconds");
    }
    return connection_.Write([&](soci::session& sql) {
        RequireCameraRow(sql, camera_id);
        RecordingPlan plan = NoPlan();
        std::tie(plan.pre_s, plan.post_s) =
            FetchOne<std::pair<int, int>>(
                sql, "select pre_record, post_record from recording_plans where camera_id = :camera", camera_id)
                .value_or(std::pair(plan.pre_s, plan.post_s));
        Mark mark;
        mark.kind = kind;
        mark.camera_id = camera_id;
        mark.moment_s = moment_s;
        mark.text = text;
        mark.reporter = reporter;
        mark.reported_s = now_s;
        mark.start_s = std::max<std::int64_t>(moment_s - plan.pre_s, 0);
        mark.end_s = moment_s + length_s + plan.post_s;
        RequireMark(mark);
        mark.id = NextId(sql, "event");  // here writers queue, so that each counts what all before it have added
        RequireWithin(sql, max_per_day, reporter, now_s);
        Insert(sql, mark);
        return mark;
    });
}

void Marks::AddAll(const std::vector<Mark>& marks) {
    std::ranges::for_each(marks, RequireMark);
    connection_.Write([&](soci::session& sql) {
        int id = NextIds(sql, "event", static_cast<int>(marks.size()));
        for (Mark mark : marks) {
            mark.id = id++;
            Insert(sql, mark);
        }
    });
}

bool Marks::Save(int id, int mount_id, const std::string& path) {
    if (path.empty() || !IsPlainText(path, kMaxPathBytes)) {
        throw InvalidRecord("a mark's path is UTF-8 without control characters");
    }
    return connection_.Execute("update marks set state = :state, mount_id = :mount, path = :path where id = :id",
                               MarkState::kSaved, mount_id, path, id) > 0;
}

bool Marks::Miss(int id, MarkState state) {
    return connection_.Execute("update marks set state = :state where id = :id and state = :known", MarkState::kMissed,
                               id, state) > 0;
}

bool Marks::Remove(int id) {
    return connection_.Execute("delete from marks where id = :id", id) > 0;
}

std::optional<Mark> Marks::Find(MarkKind kind, int id) {
    return FindById<Mark>(connection_, id, "and kind = :kind", kind);
}

std::vector<Mark> Marks::List(const MarkFilter& filter) {
    if (!filter.words.IsEmpty()) {
        return FindMarksByWords(connection_, filter);
    }
    return ListRows<Mark>(connection_, filter, StartsOf(filter),
                          [&](soci::session& sql, StartSpan starts, std::int64_t limit, const auto& visit) {
                              ForEachCamera<Mark>(connection_, sql, filter.camera_ids, starts, filter.newest_first,
                                                  limit, visit, " and end_s > :reached and :kind in (0, kind)",
                                                  filter.begin_s, NumberOf(filter.kind));
                          });
}

std::optional<Mark> Marks::Next(const Step& step, std::optional<MarkKind> kind) {
    return NextRow<Mark>(connection_, step, " and state = 1 and demo = 0 and :kind in (0, kind)", NumberOf(kind));
}

std::vector<Mark> Marks::ReportedAfter(int id, int limit) {
    return connection_.FetchAll<Mark>("where id > :id and demo = 0 order by id limit :limit", id, limit);
}

std::vector<Marks::Report> Marks::ReportsBetween(int after, int before, int limit) {
    std::vector<Report> reports;
    for (const auto& [id, camera, reported_s] : connection_.FetchAll<std::tuple<int, int, std::int64_t>>(
             "select id, camera_id, reported_s from marks where id > :after and id < :before and demo = 0"
             " order by id desc limit :limit",
             after, before, limit)) {
        reports.push_back({id, camera, reported_s});
    }
    return reports;
}

int Marks::NewestId() {
    return connection_.FetchOne<int>("select id from marks order by id desc limit 1").value_or(0);
}

std::vector<Mark> Marks::Pending() {
    return connection_.FetchAll<Mark>("where state = 0 order by end_s");
}

std::vector<Mark> Marks::EndedBy(int camera_id, std::int64_t time_s, const Mark& after, int limit) {
    return connection_.FetchAll<Mark>(
        "where camera_id = :camera and start_s >= :from and (start_s > :after or id > :id) and start_s <= :started"
        " and end_s <= :ended and state <> 0 and demo = 0 order by start_s, id limit :limit",
        camera_id, after.start_s, after.start_s, after.id, time_s, time_s, limit);
}

std::vector<Mark> Marks::OnMount(int mount_id) {
    return connection_.FetchAll<Mark>("where mount_id = :mount and state = :saved and demo = 0 order by id", mount_id,
                                      MarkState::kSaved);
}

std::vector<Event> RecordingsOf(Store& store, const Mark& mark) {
    return Events(store).List(
        {.camera_ids = {mark.camera_id}, .begin_s = mark.start_s, .end_s = std::max(mark.end_s, mark.start_s + 1)});
}

}  // namespace lookhaven::store
