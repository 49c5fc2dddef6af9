// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/connection.h"

#include <filesystem>
#include <string_view>
#include <system_error>

#include <soci/sqlite3/soci-sqlite3.h>

#include "standalone/store/engine.h"
#include "standalone/store/text.h"
#include "standalone/store/users.h"

namespace lookhaven::store {

namespace {

constexpr std::string_view kSqlitePrefix = "sqlite:";
constexpr std::string_view kPostgresqlPrefix = "postgresql:";

// How long a writer waits for another one.
constexpr const char* kBusyTimeoutS = "5";
constexpr const char* kBusyTimeoutMs = "5000";
constexpr const char* kBriefTimeoutMs = "20";

constexpr std::size_t kMaxNameBytes = 64;

// Asked after a failure: SQLite reports most of those that a full disk causes as I/O errors.
bool LiesOnFullDisk(const std::string& file) {
    std::error_code failure;
    return !file.empty() && std::filesystem::space(file, failure).available == 0 && !failure;
}

// A server that is unreachable or hangs must not hold up the recorder or a request for minutes, and a firewall on the
// way must not forget a connection that nothing uses for hours. What the address itself says about connecting goes
// first.
std::string WithTimeouts(std::string location) {
    const bool is_url = location.starts_with("postgresql://");
    for (const std::string limit : {"connect_timeout=2", "tcp_user_timeout=5000", "keepalives_idle=60"}) {
        if (location.find(limit.substr(0, limit.find('=') + 1)) == std::string::npos) {
            location += !is_url ? " " : location.find('?') == std::string::npos ? "?" : "&";
            location += limit;
        }
    }
    return location;
}

// A Store is used by one thread, so connections need no locks of their own: they would be taken for each column of each
// row. Most are opened for a few rows, so they reserve no memory: each of fifty pages would cost more than a row.
// Before the first connection; SQLite refuses it later, which costs nothing but the time.
void ConfigureSqlite() {
    static const int done = [] {
        sqlite_api::sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0);
        sqlite_api::sqlite3_config(SQLITE_CONFIG_LOOKASIDE, 0, 0);
        sqlite_api::sqlite3_config(SQLITE_CONFIG_PAGECACHE, nullptr, 0, 0);
        return sqlite_api::sqlite3_config(SQLITE_CONFIG_MULTITHREAD);
    }();
    static_cast<void>(done);
}

}  // namespace

StoreAddress StoreAddress::Parse(const std::string& url) {
    if (url.starts_with("postgresql://")) {
        return {Engine::kPostgresql, url};
    }
    if (url.starts_with(kPostgresqlPrefix)) {
        return {Engine::kPostgresql, url.substr(kPostgresqlPrefix.size())};
    }
    if (url.starts_with(kSqlitePrefix) && url.size() > kSqlitePrefix.size()) {
        std::string path = url.substr(kSqlitePrefix.size());
        if (path.find_first_of("\"\n") != std::string::npos) {
            throw StoreError("the store's path must not hold quotes or line breaks");
        }
        return {Engine::kSqlite, std::move(path)};
    }
    throw StoreError("the store's address must begin with sqlite: or postgresql:");
}

Connection::Connection(const StoreAddress& address)
    : engine_(address.engine),
      file_(IsSqlite() ? address.location : "") {
    try {
        if (engine_ == Engine::kSqlite) {
            ConfigureSqlite();
            session_.open(soci::sqlite3, "db=\"" + address.location + "\" timeout=" + kBusyTimeoutS);
            session_ << "pragma foreign_keys = on";
        } else {
            session_.open(Postgresql(), WithTimeouts(address.location));
            // Its parallel workers are processes to start, which takes longer than what they save of answers this short.
            session_ << "set statement_timeout = '5s'; set max_parallel_workers_per_gather = 0";
        }
    } catch (const soci::soci_error& error) {
        const std::string problem = "cannot open the record store: " + error.get_error_message();
        if (engine_ == Engine::kPostgresql) {
            throw StoreUnavailable(problem);
        }
        throw StoreError(problem);
    }
}

void Connection::Fail(const soci::soci_error& error) const {
    std::string problem = "the record store failed: " + error.get_error_message();
    if (LiesOnFullDisk(file_)) {
        problem += ": its disk is full";
    }
    if (!session_.is_connected()) {
        throw StoreUnavailable(problem);
    }
    throw StoreError(problem);
}

bool Connection::HasTable(const std::string& name) {
    const char* query = IsSqlite() ? "select count(*) from sqlite_master where type = 'table' and name = :name"
                                   : "select count(*) from pg_tables where schemaname = current_schema()"
                                     " and tablename = :name";
    return FetchOne<int>(query, name).value() > 0;
}

// SQLite's plain begin takes no lock: a transaction that reads and then writes would fail at once, whatever the
// time-out, when somebody wrote in between.
Connection::Transaction::Transaction(Connection& connection)
    : session_(connection.session_),
      open_transactions_(connection.open_transactions_),
      is_part_(open_transactions_++ > 0) {}

Connection::Transaction::Transaction(Connection& connection, Durability durability, LockWait lock_wait)
    : Transaction(connection) {  // so the destructor restores the settings when this fails, too
    if (is_part_) {
        return;
    }
    const bool is_lazy = durability == Durability::kLazy;
    const bool gives_up = lock_wait == LockWait::kNone;
    if (connection.IsSqlite()) {
        if (is_lazy) {
            SetUntilEnd("synchronous", "normal", "full");  // takes no effect inside a transaction
        }
        if (gives_up) {
            SetUntilEnd("busy_timeout", kBriefTimeoutMs, kBusyTimeoutMs);
        }
    }
    session_ << (connection.IsSqlite() ? "begin immediate" : "begin");
    is_open_ = true;
    if (!connection.IsSqlite()) {
        // A client that hangs inside its transaction, or whose machine does, loses its locks after that time.
        session_ << "set local idle_in_transaction_session_timeout = '20s'";
        if (is_lazy) {
            session_ << "set local synchronous_commit = off";
        }
        if (gives_up) {
            session_ << std::string("set local lock_timeout = ") + kBriefTimeoutMs;
        }
    }
}

void Connection::Transaction::SetUntilEnd(const std::string& setting, const std::string& value,
                                          const std::string& usual_value) {
    restore_.push_back("pragma " + setting + " = " + usual_value);
    session_ << "pragma " + setting + " = " + value;
}

void Connection::Transaction::Commit() {
    if (!is_part_) {
        session_ << "commit";
    }
    is_open_ = false;
}

Connection::Transaction::~Transaction() {
    --open_transactions_;
    if (is_part_) {
        return;
    }
    if (is_open_) {
        // SQLite may have rolled back by itself, as where the disk is full.
        restore_.insert(restore_.begin(), "rollback");
    }
    for (const std::string& statement : restore_) {
        try {
            session_ << statement;
        } catch (const soci::soci_error&) {
            // The connection is gone, and the transaction with it.
        }
    }
}

Connection::Snapshot::Snapshot(Connection& connection) : session_(connection.session_) {
    session_ << (connection.IsSqlite() ? "begin" : "begin isolation level repeatable read, read only");
}

Connection::Snapshot::~Snapshot() {
    try {
        session_ << "rollback";
    } catch (const soci::soci_error&) {
        // The connection is gone, and the transaction with it.
    }
}

int NextId(soci::session& sql, const std::string& counter) {
    return FetchOne<int>(sql,
                         "update counters set value = case when name = 'user' and value + 1 = :reserved then value + 2"
                         " else value + 1 end where name = :counter returning value",
                         kPairedHostUserId, counter)
        .value();
}

int NextIds(soci::session& sql, const std::string& counter, int count) {
    const char* update = "update counters set value = value + :count where name = :counter returning value";
    return FetchOne<int>(sql, update, count, counter).value() - count + 1;
}

void ThrowNotFound(const std::string& what, int id) {
    throw NotFound("there is no " + what + " " + std::to_string(id));
}

void RequireCameraRow(soci::session& sql, int id) {
    Require(FetchOne<int>(sql, "select id from cameras where id = :id", id), "camera", id);
}

void RequireFreeName(soci::session& sql, const std::string& table, const std::string& what, int id,
                     const std::string& name) {
    if (name.empty() || !IsPlainText(name, kMaxNameBytes)) {
        throw InvalidRecord(what + "'s name is 1 to 64 bytes of UTF-8 without control characters");
    }
    if (Exists(sql, "select id from " + table + " where name = :name and id <> :id", name, id)) {
        throw AlreadyExists("there is already " + what + " \"" + name + "\"");
    }
}

void RaiseRevision(soci::session& sql) {
    sql << "update counters set value = value + 1 where name = 'revision'";
}

void LockSchema(Connection& connection, soci::session& sql) {
    if (!connection.IsSqlite()) {
        sql << "select pg_advisory_xact_lock(19528)";
    }
}

}  // namespace lookhaven::store
