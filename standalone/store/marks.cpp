// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/marks.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxPathBytes = 1024;
constexpr std::int64_t kMaxFootageSeconds = kMaxMarkSeconds + 2 * kMaxAroundMarkSeconds;
constexpr std::int64_t kLastMoment = std::numeric_limits<int>::max();  // clients count in 31 bits

// SOCI binds long long, whatever std::int64_t is.
using Number = long long;

constexpr const char* kColumns =
    "select id, kind, camera_id, moment_s, start_s, end_s, text, state, mount_id, path, demo from marks";

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
        throw InvalidRecord("a mark is an alert or a sale");
    }
    if (mark.start_s < 0 || mark.end_s < mark.start_s || mark.end_s - mark.start_s > kMaxFootageSeconds ||
        mark.end_s > kLastMoment) {
        throw InvalidRecord("a mark is of a moment since 1970 and lasts 0 to 3600 seconds");
    }
    if (!IsMarkText(mark.text)) {
        throw InvalidRecord("a mark's text is lines of UTF-8 without control characters, 8192 bytes at most");
    }
}

void Insert(soci::session& sql, const Mark& mark) {
    const int kind = static_cast<int>(mark.kind);
    const int state = static_cast<int>(mark.state);
    const int demo = mark.demo;
    const Number moment = mark.moment_s;
    const Number start = mark.start_s;
    const Number end = mark.end_s;
    sql << "insert into marks (id, kind, camera_id, moment_s, start_s, end_s, text, state, mount_id, path, demo)"
           " values (:id, :kind, :camera, :moment, :start, :end, :text, :state, :mount, :path, :demo)",
        soci::use(mark.id, "id"), soci::use(kind, "kind"), soci::use(mark.camera_id, "camera"),
        soci::use(moment, "moment"), soci::use(start, "start"), soci::use(end, "end"), soci::use(mark.text, "text"),
        soci::use(state, "state"), soci::use(mark.mount_id, "mount"), soci::use(mark.path, "path"),
        soci::use(demo, "demo");
}

// A row as it is bound.
struct Row {
    Mark mark;
    int kind = 0;
    int state = 0;
    int demo = 0;
    Number moment = 0;
    Number start = 0;
    Number end = 0;

    const Mark& Read() {
        mark.kind = static_cast<MarkKind>(kind);
        mark.state = static_cast<MarkState>(state);
        mark.demo = demo != 0;
        mark.moment_s = moment;
        mark.start_s = start;
        mark.end_s = end;
        return mark;
    }
};

template <typename... Use>
std::vector<Mark> Collect(soci::session& sql, const std::string& condition, const Use&... use) {
    Row row;
    soci::statement rows(sql);
    for (int* column : {&row.mark.id, &row.kind, &row.mark.camera_id}) {
        rows.exchange(soci::into(*column));
    }
    for (Number* column : {&row.moment, &row.start, &row.end}) {
        rows.exchange(soci::into(*column));
    }
    rows.exchange(soci::into(row.mark.text));
    rows.exchange(soci::into(row.state));
    rows.exchange(soci::into(row.mark.mount_id));
    rows.exchange(soci::into(row.mark.path));
    rows.exchange(soci::into(row.demo));
    (rows.exchange(use), ...);
    rows.alloc();
    rows.prepare(kColumns + condition);
    rows.define_and_bind();
    rows.execute();
    std::vector<Mark> marks;
    while (rows.fetch()) {
        marks.push_back(row.Read());
    }
    return marks;
}

std::vector<Mark> OfCamera(soci::session& sql, const MarkFilter& filter, int camera, Number limit) {
    const Number begin = filter.begin_s;
    const Number end = filter.end_s;
    const Number earliest = std::max<Number>(begin, kMaxFootageSeconds) - kMaxFootageSeconds;
    const int kind = filter.kind ? static_cast<int>(*filter.kind) : 0;
    return Collect(sql,
                   " where camera_id = :camera and start_s >= :earliest and start_s < :end and end_s > :begin"
                   " and (:kind = 0 or kind = :kind) order by " +
                       std::string(filter.newest_first ? "start_s desc, id desc" : "start_s, id") + " limit :limit",
                   soci::use(camera, "camera"), soci::use(earliest, "earliest"), soci::use(end, "end"),
                   soci::use(begin, "begin"), soci::use(kind, "kind"), soci::use(limit, "limit"));
}

bool Affects(soci::statement change) {
    change.execute(true);
    return change.get_affected_rows() > 0;
}

}  // namespace

Mark Marks::Add(MarkKind kind, int camera_id, std::int64_t moment_s, std::int64_t length_s, const std::string& text) {
    if (moment_s < 0 || moment_s > kLastMoment || length_s < 0 || length_s > kMaxMarkSeconds) {
        throw InvalidRecord("a mark is of a moment since 1970 and lasts 0 to 3600 seconds");
    }
    return connection_.Write([&](soci::session& sql) {
        RequireCameraRow(sql, camera_id);
        RecordingPlan plan;
        sql << "select pre_record, post_record from recording_plans where camera_id = :camera",
            soci::use(camera_id, "camera"), soci::into(plan.pre_s), soci::into(plan.post_s);
        Mark mark;
        mark.kind = kind;
        mark.camera_id = camera_id;
        mark.moment_s = moment_s;
        mark.text = text;
        mark.start_s = std::max<std::int64_t>(moment_s - plan.pre_s, 0);
        mark.end_s = moment_s + length_s + plan.post_s;
        RequireMark(mark);
        mark.id = NextId(sql, "event");
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
    return connection_.Write([&](soci::session& sql) {
        const int saved = static_cast<int>(MarkState::kSaved);
        return Affects(
            (sql.prepare << "update marks set state = :state, mount_id = :mount, path = :path where id = :id",
             soci::use(saved, "state"), soci::use(mount_id, "mount"), soci::use(path, "path"), soci::use(id, "id")));
    });
}

bool Marks::Miss(int id) {
    return connection_.Write([&](soci::session& sql) {
        const int missed = static_cast<int>(MarkState::kMissed);
        return Affects((sql.prepare << "update marks set state = :state where id = :id", soci::use(missed, "state"),
                        soci::use(id, "id")));
    });
}

bool Marks::Remove(int id) {
    return connection_.Write([&](soci::session& sql) {
        return Affects((sql.prepare << "delete from marks where id = :id", soci::use(id, "id")));
    });
}

std::optional<Mark> Marks::Find(MarkKind kind, int id) {
    const int wanted = static_cast<int>(kind);
    std::vector<Mark> found = connection_.Read([&](soci::session& sql) {
        return Collect(sql, " where id = :id and kind = :kind", soci::use(id, "id"), soci::use(wanted, "kind"));
    });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<Mark> Marks::List(const MarkFilter& filter) {
    const auto offset = static_cast<std::size_t>(std::max(filter.offset, 0));
    const auto limit = static_cast<std::size_t>(std::max(filter.limit, 0));
    std::vector<Mark> marks;
    connection_.Read([&](soci::session& sql) {
        for (const int camera : filter.camera_ids) {
            std::ranges::move(OfCamera(sql, filter, camera, static_cast<Number>(offset + limit)),
                              std::back_inserter(marks));
        }
    });
    const auto key = [](const Mark& mark) { return std::pair(mark.start_s, mark.id); };
    filter.newest_first ? std::ranges::sort(marks, std::greater{}, key) : std::ranges::sort(marks, {}, key);
    marks.resize(std::min(marks.size(), offset + limit));
    marks.erase(marks.begin(), marks.begin() + static_cast<std::ptrdiff_t>(std::min(marks.size(), offset)));
    return marks;
}

std::vector<Mark> Marks::Pending() {
    return connection_.Read([](soci::session& sql) { return Collect(sql, " where state = 0 order by end_s"); });
}

std::vector<Mark> Marks::EndedBy(int camera_id, std::int64_t time_s, int limit) {
    const Number time = time_s;
    return connection_.Read([&](soci::session& sql) {
        return Collect(sql,
                       " where camera_id = :camera and start_s <= :time and end_s <= :time and state <> 0"
                       " and demo = 0 order by start_s limit :limit",
                       soci::use(camera_id, "camera"), soci::use(time, "time"), soci::use(limit, "limit"));
    });
}

std::vector<Mark> Marks::OnMount(int mount_id) {
    const int saved = static_cast<int>(MarkState::kSaved);
    return connection_.Read([&](soci::session& sql) {
        return Collect(sql, " where mount_id = :mount and state = :saved and demo = 0 order by id",
                       soci::use(mount_id, "mount"), soci::use(saved, "saved"));
    });
}

}  // namespace lookhaven::store
