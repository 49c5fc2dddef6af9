// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/month_partitions.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <limits>
#include <tuple>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/store/months.h"

namespace lookhaven::store {

namespace {

using std::chrono::months;
using std::chrono::year_month;

constexpr std::array<const char*, 2> kDivided = {"events", "marks"};
constexpr std::int64_t kDayS = 86'400;
constexpr auto kNoEnd = std::numeric_limits<std::int64_t>::max();

struct Partition {
    std::string name;
    std::int64_t from_s = 0;
    std::int64_t until_s = 0;
};

std::int64_t StartOf(year_month month) {
    return std::chrono::sys_days(month / 1).time_since_epoch().count() * kDayS;
}

year_month MonthOfDay(std::int64_t day) {
    const std::chrono::sys_days date{std::chrono::days(day)};
    const std::chrono::year_month_day parts(date);
    return parts.year() / parts.month();
}

// By the server's clock: those of hosts may differ.
year_month ThisMonth(soci::session& sql) {
    return MonthOfDay(FetchOne<std::int64_t>(sql, "select cast(extract(epoch from now()) as bigint)").value() / kDayS);
}

std::string NameOf(const std::string& table, year_month month) {
    const std::string number = std::to_string(static_cast<unsigned>(month.month()));
    return table + '_' + std::to_string(static_cast<int>(month.year())) + (number.size() < 2 ? "_0" : "_") + number;
}

// All but the default one.
std::vector<Partition> PartitionsOf(soci::session& sql, const std::string& table) {
    std::vector<Partition> partitions;
    for (const auto& [name, from_s, until_s] : FetchAll<std::tuple<std::string, std::int64_t, std::int64_t>>(
             sql,
             "select relname, coalesce(cast(substring(bounds from 'FROM \\(''?(-?[0-9]+)') as bigint), :lowest),"
             " cast(substring(bounds from 'TO \\(''?(-?[0-9]+)') as bigint) from"
             " (select relname, pg_get_expr(relpartbound, pg_class.oid) as bounds from pg_inherits join pg_class"
             " on pg_class.oid = inhrelid where inhparent = cast(:table as regclass)) as partitions"
             " where bounds <> 'DEFAULT' order by relname",
             std::numeric_limits<std::int64_t>::min(), table)) {
        partitions.push_back({name, from_s, until_s});
    }
    return partitions;
}

bool IsEmpty(soci::session& sql, const std::string& table) {
    return !FetchOne<int>(sql, "select 1 from " + table + " limit 1");
}

// What waits for a lock holds up all that come after it.
void LimitWaiting(soci::session& sql) {
    sql << "set local lock_timeout = '1500ms'";
    sql << "set local statement_timeout = '60s'";
}

// The default partition is locked first: whoever reads the table has locked that before the partitions.
void MakePartition(soci::session& sql, const std::string& table, year_month month) {
    const std::string other = table + "_other";
    const std::string name = NameOf(table, month);
    const std::string from = std::to_string(StartOf(month));
    const std::string until = std::to_string(StartOf(month + months(1)));
    const std::string rows = " from " + other + " where start_s >= " + from + " and start_s < " + until;
    sql << "lock table " + other;
    sql << "create table " + name + " (like " + table + " including defaults)";
    sql << "insert into " + name + " select *" + rows;
    sql << "alter table " + other + " disable trigger user";  // the notes of kept events stay
    sql << "delete" + rows;
    sql << "alter table " + other + " enable trigger user";
    sql << "alter table " + table + " attach partition " + name + " for values from (" + from + ") to (" + until + ")";
}

// The table is locked first, as by whoever reads it.
void DropEmpty(soci::session& sql, const std::string& table, std::int64_t before_s) {
    std::vector<Partition> empty = PartitionsOf(sql, table);
    std::erase_if(empty, [&](const Partition& partition) {
        return partition.until_s > before_s || !IsEmpty(sql, partition.name);
    });
    for (const Partition& partition : empty) {
        sql << "lock table only " + table;
        sql << "lock table " + partition.name;
        if (IsEmpty(sql, partition.name)) {
            sql << "drop table " + partition.name;
        }
    }
}

}  // namespace

std::set<year_month> PastMonths(soci::session& sql, const std::set<std::int64_t>& days) {
    const std::int64_t end = StartOf(ThisMonth(sql) + months(2)) / kDayS;
    std::set<year_month> past;
    std::transform(days.begin(), days.lower_bound(end), std::inserter(past, past.end()), MonthOfDay);
    return past;
}

void MakePartitions(soci::session& sql, year_month month) {
    for (const char* table : kDivided) {
        const std::int64_t start_s = StartOf(month);
        const std::vector<Partition> partitions = PartitionsOf(sql, table);
        if (std::ranges::none_of(partitions, [start_s](const Partition& partition) {
                return partition.from_s <= start_s && start_s < partition.until_s;
            })) {
            MakePartition(sql, table, month);
        }
    }
}

void MaintainPartitions(Store& store) {
    Connection& connection = store.connection();
    if (connection.IsSqlite()) {
        return;
    }
    const auto change = [&connection](auto&& work) {
        return connection.Write([&](soci::session& sql) {
            LimitWaiting(sql);
            LockSchema(connection, sql);
            return work(sql);
        });
    };
    const auto& [this_month, wanted] = change([](soci::session& sql) {
        const year_month now = ThisMonth(sql);
        Execute(sql,
                "insert into event_months (start_s, first_id) select cast(:start as bigint), value + 1 from counters"
                " where name = 'event' on conflict (start_s) do nothing",
                StartOf(now));
        std::set<year_month> all =
            PastMonths(sql, FetchAll<std::int64_t, std::set<std::int64_t>>(sql, "select distinct start_s / 86400"
                                                                                " from events_other"));
        all.insert({now, now + months(1)});
        return std::pair(now, all);
    });
    for (const year_month month : wanted) {
        change([month](soci::session& sql) { MakePartitions(sql, month); });
    }
    // Two that each removed what the other one still saw have left it.
    change([](soci::session& sql) {
        Execute(sql, "select forget_event_place(camera_id, mount_id) from event_places as place where not exists"
                     " (select from events where camera_id = place.camera_id and mount_id = place.mount_id)");
    });
    for (const char* table : kDivided) {
        change([&](soci::session& sql) { DropEmpty(sql, table, StartOf(this_month)); });
    }
}

std::vector<Span> NearestFirst(const Connection& connection, Span all, bool newest_first) {
    // From 1970 on is from the first month on, which may be any.
    if (connection.IsSqlite() || (!newest_first && all.from_s == 0)) {
        return {all};
    }
    std::vector<Span> spans;
    const std::int64_t newest_s = std::clamp<std::int64_t>(all.until_s, 0, base::WallSeconds());
    const std::int64_t oldest_s = std::min(all.from_s, base::WallSeconds());
    for (const std::int64_t near_s : {31 * kDayS, 186 * kDayS}) {
        const std::int64_t border_s = newest_first ? newest_s - near_s : oldest_s + near_s;
        if (border_s <= all.from_s || border_s >= all.until_s) {
            break;
        }
        spans.push_back(newest_first ? Span{border_s, all.until_s} : Span{all.from_s, border_s});
        (newest_first ? all.until_s : all.from_s) = border_s;
    }
    spans.push_back(all);
    return spans;
}

// A recorder takes ids some events in advance, so what begins a month may have one of the month before.
std::optional<Span> LikelySpan(soci::session& sql, int id) {
    const auto [from_s, until_s] =
        FetchOne<std::pair<std::int64_t, std::int64_t>>(
            sql,
            "select coalesce((select max(start_s) from event_months where first_id <= :id), 0),"
            " coalesce((select min(start_s) from event_months where first_id > :same), :none)",
            id, id, kNoEnd - kDayS)
            .value();
    const Span span{from_s, until_s + kDayS};
    return from_s == 0 && span.until_s == kNoEnd ? std::nullopt : std::optional(span);
}

}  // namespace lookhaven::store
