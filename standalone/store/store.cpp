// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/store.h"

#include <charconv>
#include <chrono>
#include <filesystem>
#include <string_view>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/store/connection.h"
#include "standalone/store/engine.h"
#include "standalone/store/schema.h"
#include "standalone/store/secret.h"
#include "standalone/store/sessions.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kInstallationIdBytes = 16;
constexpr int kLogAttempts = 100;
constexpr std::chrono::milliseconds kLogAttemptPause{50};
constexpr std::chrono::minutes kAheadMaxAge{15};
constexpr std::chrono::seconds kAnswerLimit{2};
constexpr int kMigrationAttempts = 4;
constexpr std::chrono::seconds kMigrationPause{2};

// 0 for a store without a schema.
int ReadVersion(Connection& connection) {
    return connection.HasTable("schema_version")
               ? connection.FetchOne<int>("select version from schema_version").value()
               : 0;
}

// The schema of the oldest programs that can use this program's store.
int OldestCompatible() {
    int version = 0;
    int compatible = 0;
    for (const Migration& migration : Migrations()) {
        compatible = migration.is_addition ? compatible : version + 1;
        ++version;
    }
    return compatible;
}

// Whether the newer program that has brought the store to its schema has left it to this one, too.
bool IsCompatible(Connection& connection) {
    const std::string oldest =
        connection.FetchOne<std::string>("select value from settings where name = 'schema_compatible'").value_or("");
    int version = 0;
    const char* const end = oldest.data() + oldest.size();
    const auto [rest, error] = std::from_chars(oldest.data(), end, version);
    return error == std::errc() && rest == end && version > 0 && version <= Store::SchemaVersion();
}

[[noreturn]] void ThrowNewer(int version) {
    throw SchemaError("the record store has schema " + std::to_string(version) + ", newer than this program's " +
                      std::to_string(Store::SchemaVersion()) + ": update Lookhaven on this host");
}

// Every request opens the store, so it asks for the version first, and whether there is one only where that fails.
int ReadVersionOfReady(Connection& connection) try {
    return connection.FetchOne<int>("select version from schema_version").value();
} catch (const std::exception&) {
    return ReadVersion(connection);
}

// In one round trip to a server that may have been idle, lost, stopped or demoted since the last one.
int ReadVersionOfIdle(Connection& connection) {
    if (connection.IsSqlite()) {
        return ReadVersionOfReady(connection);
    }
    const char* query = "select version from schema_version where current_setting('transaction_read_only') = 'off'";
    return connection.Read([&](soci::session& sql) {
        const std::optional<std::string> version = AskWithin(sql, query, kAnswerLimit);
        if (!version) {
            throw StoreUnavailable("the database server does not answer, or takes no changes");
        }
        return std::stoi(*version);
    });
}

void CheckVersion(Connection& connection, int version) {
    if (version > Store::SchemaVersion() && !IsCompatible(connection)) {
        ThrowNewer(version);
    }
    if (version == 0) {
        throw SchemaError("the record store is not set up yet: run lookhaven init");
    }
    if (version < Store::SchemaVersion()) {
        throw SchemaError("the record store has schema " + std::to_string(version) + ", this program needs " +
                          std::to_string(Store::SchemaVersion()) + ": run lookhaven init");
    }
}

// SQLite never waits for the lock that this needs, so it is tried again for as long as it waits elsewhere.
std::string SwitchToWriteAheadLog(const StoreAddress& address) {
    for (int attempt = 1;; ++attempt) {
        try {
            return Connection(address).FetchOne<std::string>("pragma journal_mode = wal").value_or("");
        } catch (const StoreError& failure) {
            if (attempt == kLogAttempts || !std::string_view(failure.what()).ends_with("database is locked")) {
                throw;
            }
            std::this_thread::sleep_for(kLogAttemptPause);
        }
    }
}

// SQLite's write-ahead log takes its mode from the file, so a private file keeps all of them private.
void PrepareFile(const StoreAddress& address) {
    if (address.engine != Engine::kSqlite) {
        return;
    }
    try {
        base::OpenFile(address.location, O_RDWR | O_CREAT, 0600);
    } catch (const std::system_error& error) {
        throw StoreError(error.what());
    }
    if (SwitchToWriteAheadLog(address) != "wal") {
        throw StoreError("the record store's folder does not allow a write-ahead log: use a local file system");
    }
}

// A private, empty file for SQLite to fill; what an earlier attempt left is removed. Removed unless renamed.
class PartialCopy {
  public:
    explicit PartialCopy(std::string where) : path(std::move(where)), file(OpenNew()) {}
    PartialCopy(const PartialCopy&) = delete;
    PartialCopy& operator=(const PartialCopy&) = delete;
    ~PartialCopy() { Remove(); }

    void Remove() const {
        for (const char* suffix : {"", "-journal", "-wal", "-shm"}) {
            ::unlink((path + suffix).c_str());
        }
    }

    const std::string path;
    const base::FileDescriptor file;

  private:
    base::FileDescriptor OpenNew() const {
        Remove();
        return base::OpenFile(path, O_WRONLY | O_CREAT | O_EXCL, 0600);
    }
};

// Whether a copy made ahead is new enough; it lacks what was stored since.
bool IsRecent(const std::filesystem::path& copy) {
    std::error_code none;
    const auto made = std::filesystem::last_write_time(copy, none);
    const auto now = std::filesystem::file_time_type::clock::now();
    return !none && made <= now && now - made < kAheadMaxAge;
}

void MakeCopy(Connection& connection, int version, const std::filesystem::path& file) {
    const PartialCopy copy(file.string() + ".new");
    connection.Read([&](soci::session& sql) { sql << "vacuum into :copy", soci::use(copy.path); });
    {
        Connection copied({Engine::kSqlite, copy.path});
        if (ReadVersion(copied) != version) {
            throw StoreError("another program is upgrading it");
        }
        copied.Execute("delete from sessions");
    }
    if (::fsync(copy.file.Get()) != 0) {
        base::ThrowErrno("cannot write " + copy.path);
    }
    std::filesystem::rename(copy.path, file);
}

int TakeSteps(const Connection& connection, soci::session& sql, int version) {
    if (version == 0) {
        sql << "create table schema_version (version integer not null)";
        sql << "insert into schema_version (version) values (0)";
    }
    int steps = 0;
    for (const Migration& migration : Migrations().subspan(static_cast<std::size_t>(version))) {
        for (const auto& statements :
             {migration.statements, connection.IsSqlite() ? migration.on_sqlite : migration.on_postgresql}) {
            for (const char* statement : statements) {
                sql << statement;
            }
        }
        ++steps;
    }
    const int reached = version + steps;
    Execute(sql, "update schema_version set version = :version", reached);
    Execute(sql,
            "insert into settings (name, value) values ('schema_compatible', :oldest)"
            " on conflict (name) do update set value = excluded.value",
            std::to_string(OldestCompatible()));
    return steps;
}

void SetOnce(soci::session& sql, const std::string& setting, const std::string& value) {
    Execute(sql, "insert into settings (name, value) values (:name, :value) on conflict (name) do nothing", setting,
            value);
}

}  // namespace

Store::Store(std::unique_ptr<Connection> connection) : connection_(std::move(connection)) {}
Store::Store(Store&&) noexcept = default;
Store& Store::operator=(Store&&) noexcept = default;
Store::~Store() = default;

int Store::SchemaVersion() {
    return static_cast<int>(Migrations().size());
}

Store Store::Open(const std::string& url) {
    const StoreAddress address = StoreAddress::Parse(url);
    if (address.engine == Engine::kSqlite && !std::filesystem::exists(address.location)) {
        throw SchemaError("there is no record store at " + address.location + ": run lookhaven init");
    }
    auto connection = std::make_unique<Connection>(address);
    CheckVersion(*connection, ReadVersionOfReady(*connection));
    return Store(std::move(connection));
}

bool Store::IsSqlite() const {
    return connection_->IsSqlite();
}

bool Store::IsUpToDate() try {
    CheckVersion(*connection_, ReadVersionOfIdle(*connection_));
    return true;
} catch (const std::exception&) {
    return false;
}

int Store::Migrate(const std::string& url) {
    const StoreAddress address = StoreAddress::Parse(url);
    PrepareFile(address);
    Connection connection(address);
    const auto take_steps = [&](soci::session& sql) {
        if (!connection.IsSqlite()) {
            Execute(sql, "set local statement_timeout = 0");  // a step may rewrite a million rows …
            Execute(sql, "set local lock_timeout = '5s'");    // … but one that waits for a lock blocks all others
        }
        LockSchema(connection, sql);
        const int version = ReadVersion(connection);
        if (version > SchemaVersion() && !IsCompatible(connection)) {
            ThrowNewer(version);
        }
        const int steps = version >= SchemaVersion() ? 0 : TakeSteps(connection, sql, version);
        SetOnce(sql, "installation", RandomHex(kInstallationIdBytes));
        SetOnce(sql, "session_key", RandomHex(Sessions::kKeyDigits / 2));
        return steps;
    };
    // Other hosts go on using PostgreSQL meanwhile, so one of the locks may not be had within its five seconds.
    for (int attempt = 1;; ++attempt) {
        try {
            return connection.Write(take_steps);
        } catch (const StoreUnavailable&) {
            throw;
        } catch (const SchemaError&) {
            throw;
        } catch (const StoreError&) {
            if (connection.IsSqlite() || attempt == kMigrationAttempts) {
                throw;
            }
        }
        std::this_thread::sleep_for(kMigrationPause);
    }
}

bool Store::CopyIfOlder(const std::string& url, const std::filesystem::path& folder, Copy when) try {
    const StoreAddress address = StoreAddress::Parse(url);
    if (address.engine != Engine::kSqlite || !std::filesystem::exists(address.location)) {
        return false;
    }
    // One program at a time.
    const base::FileDescriptor place = base::OpenFile(folder, O_RDONLY | O_DIRECTORY);
    if (::flock(place.Get(), LOCK_EX) != 0) {
        base::ThrowErrno("cannot lock " + folder.string());
    }
    Connection connection(address);
    const int version = ReadVersion(connection);
    if (version == 0 || version >= SchemaVersion()) {
        return false;
    }
    const std::filesystem::path file = folder / ("lookhaven.db.schema-" + std::to_string(version));
    const std::filesystem::path ahead = file.string() + ".ahead";
    if (when == Copy::kNow && IsRecent(ahead)) {
        std::filesystem::rename(ahead, file);
    } else {
        std::filesystem::remove(ahead);
        if (std::filesystem::space(folder).available < 3 * std::filesystem::file_size(address.location)) {
            throw StoreError("there is no room for it beside an upgrade");
        }
        MakeCopy(connection, version, when == Copy::kAhead ? ahead : file);
    }
    if (::fsync(place.Get()) != 0) {
        base::ThrowErrno("cannot write " + folder.string());
    }
    return true;
} catch (const std::exception& error) {
    throw StoreError(std::string("the record store was not copied: ") + error.what());
}

std::vector<std::string> Store::Check() {
    std::vector<std::string> findings;
    if (connection_->IsSqlite()) {
        for (const std::string& text : connection_->FetchAll<std::string>("pragma integrity_check")) {
            if (text != "ok") {
                findings.push_back("the record store is damaged: " + text + "; restore it from a backup");
            }
        }
    }
    for (const int camera :
         connection_->FetchAll<int>("select id from cameras where not exists (select 1 from camera_profiles"
                                    " where camera_id = cameras.id and number = live_profile) order by id")) {
        findings.push_back("camera " + std::to_string(camera) +
                           " has no source for its live view: lookhaven camera set " + std::to_string(camera) +
                           " --live high --source ADDRESS");
    }
    return findings;
}

}  // namespace lookhaven::store
