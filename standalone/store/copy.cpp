// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/copy.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <deque>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "standalone/store/connection.h"
#include "standalone/store/month_partitions.h"
#include "standalone/store/schema.h"

namespace lookhaven::store {

namespace {

// What belongs to the place and not to the records.
constexpr std::array<std::string_view, 7> kNotCopied = {"schema_version", "recorder_lease",     "camera_leases",
                                                        "login_attempts", "shared_mount_hosts", "mount_leases",
                                                        "event_id_blocks"};

constexpr std::string_view kPictures = "emap_pictures";

// PostgreSQL's client takes in all rows of an answer.
constexpr const char* kOpenCursor = "declare copied no scroll cursor for select * from ";
constexpr const char* kFetchFromCursor = "fetch 1000 from copied";
constexpr const char* kFetchLargeFromCursor = "fetch 1 from copied";  // a row of megabytes
constexpr const char* kCloseCursor = "close copied";

// In the order in which they were created, so that what refers to a row comes after it.
std::vector<std::string> CopiedTables(CopySessions sessions, CopyPictures pictures) {
    constexpr std::string_view kCreate = "create table ";
    std::vector<std::string> tables;
    for (const Migration& migration : Migrations()) {
        for (const std::string_view statement : migration.statements) {
            if (!statement.starts_with(kCreate)) {
                continue;
            }
            const std::string_view rest = statement.substr(kCreate.size());
            const std::string_view name = rest.substr(0, rest.find(' '));
            if (std::ranges::find(kNotCopied, name) == kNotCopied.end() &&
                (name != "sessions" || sessions == CopySessions::kYes) &&
                (name != kPictures || pictures == CopyPictures::kYes)) {
                tables.emplace_back(name);
            }
        }
    }
    return tables;
}

// What SQLite has of its own, in small letters as they are compared.
std::set<std::string> OwnStatements() {
    std::set<std::string> own;
    for (const Migration& migration : Migrations()) {
        for (std::string statement : migration.on_sqlite) {
            std::ranges::transform(statement, statement.begin(),
                                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
            own.insert(statement);
        }
    }
    return own;
}

// A value of either of the two types that columns have.
struct Value {
    bool is_text = false;
    long long number = 0;
    std::string text;
};

void Assign(const soci::row& row, std::size_t column, Value& value) {
    switch (row.get_properties(column).get_data_type()) {
    case soci::dt_string:
        value.is_text = true;
        value.text = row.get<std::string>(column);
        return;
    case soci::dt_integer:
        value.number = row.get<int>(column);
        return;
    case soci::dt_long_long:
        value.number = row.get<long long>(column);
        return;
    default:
        throw StoreError("the record store has a column " + row.get_properties(column).get_name() +
                         " of a type that cannot be copied");
    }
}

// It becomes part of a statement, and the source may be a file from anywhere.
std::string PlainName(const std::string& column) {
    if (column.empty() || column.find_first_not_of("abcdefghijklmnopqrstuvwxyz_") != std::string::npos) {
        throw StoreError("the record store has a column of a name that is none of its own");
    }
    return column;
}

// Inserts rows whose columns are those of the first one.
class Insertion {
  public:
    Insertion(soci::session& sql, const std::string& table, const soci::row& first) : statement_(sql) {
        std::string columns;
        for (std::size_t i = 0; i < first.size(); ++i) {
            columns += (i == 0 ? "" : ", ") + PlainName(first.get_properties(i).get_name());
            Assign(first, i, values_.emplace_back());
            if (values_.back().is_text) {
                statement_.exchange(soci::use(values_.back().text));
            } else {
                statement_.exchange(soci::use(values_.back().number));
            }
        }
        statement_.alloc();
        statement_.prepare(InsertText(table, columns), kRepeatedly);
        statement_.define_and_bind();
    }

    void Run(const soci::row& row) {
        for (std::size_t i = 0; i < values_.size(); ++i) {
            Assign(row, i, values_[i]);
        }
        store::Run(statement_);
    }

  private:
    std::deque<Value> values_;  // stay where they are, since they are bound
    soci::statement statement_;
};

// Calls use(row) for each row of the answer; returns their number.
template <typename Use>
std::int64_t Visit(soci::session& sql, const std::string& query, Use&& use) {
    soci::row row;
    soci::statement statement(sql);
    statement.exchange(soci::into(row));
    statement.alloc();
    statement.prepare(query, kOnce);
    statement.define_and_bind();
    std::int64_t rows = 0;
    for (bool has_row = statement.execute(true); has_row; has_row = statement.fetch()) {
        use(row);
        ++rows;
    }
    return rows;
}

std::int64_t CopyTable(Connection& source, soci::session& from, soci::session& to, const std::string& table) {
    std::optional<Insertion> insertion;
    const auto insert = [&](const soci::row& row) {
        if (!insertion) {
            insertion.emplace(to, table, row);
        }
        insertion->Run(row);
    };
    if (source.IsSqlite()) {
        return Visit(from, "select * from " + table, insert);
    }
    from << kOpenCursor + table;
    std::int64_t all = 0;
    std::int64_t rows = 0;
    const char* const fetch = table == kPictures ? kFetchLargeFromCursor : kFetchFromCursor;
    do {
        rows = Visit(from, fetch, insert);
        all += rows;
    } while (rows > 0);
    from << kCloseCursor;
    return all;
}

// A newer program may have added tables and columns that would be left out.
void RequireKnown(soci::session& sql) {
    if (FetchOne<int>(sql, "select version from schema_version") != Store::SchemaVersion()) {
        throw SchemaError("a newer program has changed the record store, which this one can use but not copy:"
                          " update Lookhaven on this host");
    }
}

void LiftTimeLimit(Connection& connection, soci::session& sql) {
    if (!connection.IsSqlite()) {
        sql << "set local statement_timeout = 0";
    }
}

}  // namespace

void RequireUnused(Store& store) {
    for (const auto& [table, records] : {std::pair("users", "accounts"), std::pair("cameras", "cameras"),
                                         std::pair("events", "recordings"), std::pair("marks", "alerts")}) {
        if (store.connection().FetchOne<int>(std::string("select count(*) from ") + table).value() > 0) {
            throw InvalidRecord("the record store to fill is in use, it has " + std::string(records) +
                                " of its own: use an empty one");
        }
    }
}

// By their text alone: to ask SQLite what a table is would run what shall be refused.
void RequireTablesOnly(const std::string& url) {
    const std::set<std::string> own = OwnStatements();
    for (const std::string& statement :
         Connection(StoreAddress::Parse(url))
             .FetchAll<std::string>("select lower(sql) from sqlite_master where sql <> ''"
                                    " and not (type = 'table' and lower(sql) like 'create table %')"
                                    " and not (type = 'index' and lower(sql) like 'create index %')"
                                    " and not (type = 'index' and lower(sql) like 'create unique index %')")) {
        if (!own.contains(statement)) {
            throw InvalidRecord("the records hold views, triggers or virtual tables that are none of Lookhaven's own");
        }
    }
}

void CheckpointWal(Store& store) {
    if (store.connection().FetchOne<std::string>("pragma journal_mode = delete") != "delete") {
        throw StoreError("the records could not be written to one file");
    }
}

std::int64_t CopyRecords(Store& source, Store& target, CopySessions sessions, CopyPictures pictures) {
    const std::vector<std::string> tables = CopiedTables(sessions, pictures);
    return source.connection().ReadAtOneMoment([&](soci::session& from) {
        RequireKnown(from);
        LiftTimeLimit(source.connection(), from);
        const std::map<std::int64_t, std::int64_t> events_by_day =
            target.IsSqlite() ? std::map<std::int64_t, std::int64_t>() : EventsByDay(from, "events");
        return target.connection().Write([&](soci::session& to) {
            LiftTimeLimit(target.connection(), to);
            LockSchema(target.connection(), to);
            RequireUnused(target);
            if (!target.connection().IsSqlite()) {
                // Otherwise all rows would go to the default partition and have to be moved later.
                MakePartitionsFor(to, events_by_day);
                Execute(to, "delete from month_first_ids");  // they are not of the ids that are copied
            }
            for (auto table = tables.rbegin(); table != tables.rend(); ++table) {
                Execute(to, "delete from " + *table);
            }
            std::int64_t rows = 0;
            for (const std::string& table : tables) {
                rows += CopyTable(source.connection(), from, to, table);
            }
            Execute(to, "update hosts set holder = ''");
            return rows;
        });
    });
}

}  // namespace lookhaven::store
