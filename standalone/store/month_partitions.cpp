// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/month_partitions.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <exception>
#include <functional>
#include <limits>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "standalone/store/connection.h"

namespace lookhaven::store {

namespace {

using std::chrono::months;
using std::chrono::year_month;

struct PartitionedTable {
    const char* name;
    std::int64_t max_moved_rows;  // more would hold up others too long; marks move more slowly, with their word index
};
constexpr std::array<PartitionedTable, 2> kPartitionedTables = {{{"events", 200'000}, {"marks", 30'000}}};
constexpr std::int64_t kDayS = 86'400;

// Of [begin_s, end_s).
struct Partition {
    std::string name;
    std::int64_t begin_s = 0;
    std::int64_t end_s = 0;
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

// All but the default one. Their bounds are told as "FOR VALUES FROM ('1577836800') TO ('1580515200')", where the first
// may be MINVALUE. Names are as a statement takes them.
std::vector<Partition> PartitionsOf(soci::session& sql, const std::string& table) {
    std::vector<Partition> partitions;
    for (const auto& [name, begin_s, end_s] : FetchAll<std::tuple<std::string, std::int64_t, std::int64_t>>(
             sql,
             "select name, coalesce(cast(substring(bounds from 'FROM \\(''?(-?[0-9]+)') as bigint), :lowest),"
             " cast(substring(bounds from 'TO \\(''?(-?[0-9]+)') as bigint) from"
             " (select cast(cast(pg_class.oid as regclass) as text) as name, pg_get_expr(relpartbound, pg_class.oid) "
             "as bounds from pg_inherits join pg_class"
             " on pg_class.oid = inhrelid where inhparent = cast(:table as regclass)) as partitions"
             " where bounds <> 'DEFAULT'",
             std::numeric_limits<std::int64_t>::min(), table)) {
        partitions.push_back({name, begin_s, end_s});
    }
    return partitions;
}

bool IsEmpty(soci::session& sql, const std::string& table) {
    // By an index: a scan of the table might pass over many deleted rows first.
    return !Exists(sql, "select id from " + table + " order by id desc limit 1");
}

// Throws StoreError where too many rows would be moved. Locks the table before its default partition, as readers do: a
// reader that waited for the default partition alone would already have the old list of partitions, and miss the
// rows that were moved.
void MakePartition(soci::session& sql, const PartitionedTable& partitioned, year_month month) {
    const std::string table = partitioned.name;
    const std::string rest = table + "_default";
    const std::string name = NameOf(table, month);
    const std::string begin = std::to_string(StartOf(month));
    const std::string end = std::to_string(StartOf(month + months(1)));
    const std::string rows = " from " + rest + " where start_s >= " + begin + " and start_s < " + end;
    if (Exists(sql, "select 1" + rows + " offset :most limit 1", partitioned.max_moved_rows)) {
        throw StoreError("more than " + std::to_string(partitioned.max_moved_rows) + " rows of " + name + " stay in " +
                         rest);
    }
    sql << "lock table only " + table;
    sql << "lock table " + rest;
    sql << "create table " + name + " (like " + table + " including defaults)";
    sql << "insert into " + name + " select *" + rows;
    sql << "delete" + rows;
    sql << "alter table " + table + " attach partition " + name + " for values from (" + begin + ") to (" + end + ")";
}

void MakePartitionIfNone(soci::session& sql, const PartitionedTable& table, year_month month) {
    const std::int64_t start_s = StartOf(month);
    const std::vector<Partition> partitions = PartitionsOf(sql, table.name);
    if (std::ranges::none_of(partitions, [start_s](const Partition& partition) {
            return partition.begin_s <= start_s && start_s < partition.end_s;
        })) {
        MakePartition(sql, table, month);
    }
}

// Those with at least kMinEventsForPartition events, the newest first, without those after the next one.
std::vector<year_month> MonthsOf(soci::session& sql, const std::map<std::int64_t, std::int64_t>& events_by_day) {
    const std::int64_t end = StartOf(ThisMonth(sql) + months(2)) / kDayS;
    std::map<year_month, std::int64_t, std::greater<>> events_by_month;
    for (auto day = events_by_day.lower_bound(0); day != events_by_day.lower_bound(end); ++day) {
        events_by_month[MonthOfDay(day->first)] += day->second;
    }
    std::vector<year_month> found;
    for (const auto& [month, events] : events_by_month) {
        if (events >= kMinEventsForPartition) {
            found.push_back(month);
        }
    }
    return found;
}

// Drops the partitions that end by then and are empty. Dropping locks the table itself, too: first, as readers do, so
// that none waits for the other.
void DropEmpty(soci::session& sql, const std::string& table, std::int64_t before_s) {
    std::vector<Partition> empty = PartitionsOf(sql, table);
    std::erase_if(
        empty, [&](const Partition& partition) { return partition.end_s > before_s || !IsEmpty(sql, partition.name); });
    for (const Partition& partition : empty) {
        sql << "lock table only " + table;
        sql << "lock table " + partition.name;
        if (IsEmpty(sql, partition.name)) {
            sql << "drop table " + partition.name;
        }
    }
}

void NoteFirstId(soci::session& sql, year_month month) {
    // Notes of later months are those of a server's clock that was wrong.
    Execute(sql, "delete from month_first_ids where start_s > :start", StartOf(month));
    Execute(sql,
            "insert into month_first_ids (start_s, first_id) select cast(:start as bigint), value + 1 from counters"
            " where name = 'event' on conflict (start_s) do nothing",
            StartOf(month));
}

// Where two transactions removed the last two events of a pair at the same time, each still saw the other's and left
// the pair.
void ForgetPairsWithoutEvents(soci::session& sql) {
    Execute(sql, "select forget_event_camera(camera_id, mount_id) from event_cameras as pair where not exists"
                 " (select from events where camera_id = pair.camera_id and mount_id = pair.mount_id)"
                 " order by mount_id, camera_id");
}

}  // namespace

std::map<std::int64_t, std::int64_t> EventsByDay(soci::session& sql, const char* table) {
    return FetchAll<std::pair<std::int64_t, std::int64_t>, std::map<std::int64_t, std::int64_t>>(
        sql, std::string("select start_s / 86400, count(*) from ") + table + " group by start_s / 86400");
}

void MakePartitionsFor(soci::session& sql, const std::map<std::int64_t, std::int64_t>& events_by_day) {
    for (const year_month month : MonthsOf(sql, events_by_day)) {
        for (const PartitionedTable& table : kPartitionedTables) {
            MakePartitionIfNone(sql, table, month);
        }
    }
}

void MaintainPartitions(Store& store, const std::stop_token& stop) {
    Connection& connection = store.connection();
    if (connection.IsSqlite()) {
        return;
    }
    const auto change = [&connection](auto&& work) {
        return connection.Write([&](soci::session& sql) {
            // For a turn, and for what only reads much on a slow disk.
            sql << "set local statement_timeout = '60s'";
            LockSchema(connection, sql);  // first: whoever waits for it holds no lock that others need
            sql << "set local lock_timeout = '1500ms'";
            return work(sql);
        });
    };
    std::exception_ptr failure;
    const auto attempt = [&](auto&& work) {
        if (stop.stop_requested()) {
            return false;
        }
        try {
            change(work);
            return true;
        } catch (const StoreUnavailable&) {
            throw;
        } catch (const StoreError&) {
            failure = std::current_exception();
            return false;
        }
    };
    const year_month now = change([](soci::session& sql) {
        const year_month month = ThisMonth(sql);
        NoteFirstId(sql, month);
        return month;
    });
    const auto make = [&](year_month month) {
        for (const PartitionedTable& table : kPartitionedTables) {
            const bool is_made = attempt([&](soci::session& sql) {
                sql << "set local statement_timeout = '5s'";  // others wait for it
                MakePartitionIfNone(sql, table, month);
            });
            if (!is_made && month < now) {
                break;  // without events, an empty partition of marks would be dropped and made again each time
            }
        }
    };
    make(now);
    make(now + months(1));
    attempt(ForgetPairsWithoutEvents);
    for (const PartitionedTable& table : kPartitionedTables) {
        attempt([&](soci::session& sql) { DropEmpty(sql, table.name, StartOf(now)); });
    }
    std::vector<year_month> past_months;
    attempt([&](soci::session& sql) { past_months = MonthsOf(sql, EventsByDay(sql, "events_default")); });
    std::erase_if(past_months, [now](year_month month) { return month >= now; });
    std::ranges::for_each(past_months, make);
    if (failure) {
        std::rethrow_exception(failure);
    }
}

}  // namespace lookhaven::store
