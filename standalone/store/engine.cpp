// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/engine.h"

#include <memory>
#include <utility>

#include <soci/postgresql/soci-postgresql.h>
#include <soci/sqlite3/soci-sqlite3.h>
#include <soci/version.h>

#include <dlfcn.h>
#include <libpq-fe.h>
#include <poll.h>

#include "standalone/store/connection.h"

namespace lookhaven::store {

namespace {

// Statements as requests make them, on a store in memory: a function of a library is bound by its first call.
void WarmUpSqlite() {
    {
        Connection connection({Engine::kSqlite, ":memory:"});
        connection.Write([](soci::session& sql) {
            sql << "create table warm_up (id integer, name text)";
            Execute(sql, "insert into warm_up (id, name) values (:id, :name)", 1, std::string("one"));
        });
        connection.HasTable("warm_up");
        connection.FetchAll<std::pair<int, std::string>>("select id, name from warm_up where name = :name order by id",
                                                         std::string("one"));
    }
    sqlite_api::sqlite3_randomness(0, nullptr);  // else all processes would go on with the same numbers
}

[[noreturn]] void ThrowNoClient() {
    throw StoreError(std::string("cannot load the client of PostgreSQL: ") + ::dlerror());
}

// SOCI's part for PostgreSQL, for the rest of the process's life. Throws StoreError.
void* Library() {
    static void* const library = [] {
        const std::string file = "libsoci_postgresql.so." + std::to_string(SOCI_VERSION / 100'000) + '.' +
                                 std::to_string(SOCI_VERSION / 100 % 1'000);
        void* opened = ::dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL);
        if (opened == nullptr) {
            ThrowNoClient();
        }
        return opened;
    }();
    return library;
}

// A function of that library, or of libpq, with which it is linked. Throws StoreError.
template <typename Function>
Function* FindFunction(const char* name) {
    void* found = ::dlsym(Library(), name);
    if (found == nullptr) {
        ThrowNoClient();
    }
    return reinterpret_cast<Function*>(found);
}

}  // namespace

const soci::backend_factory& Postgresql() {
    static const soci::backend_factory* const factory =
        FindFunction<const soci::backend_factory*()>("factory_postgresql")();
    return *factory;
}

std::optional<std::string> AskWithin(soci::session& sql, const char* statement, std::chrono::milliseconds limit) {
    using Clock = std::chrono::steady_clock;
    using Result = std::unique_ptr<PGresult, decltype(PQclear)*>;
    auto* const is_busy = FindFunction<decltype(PQisBusy)>("PQisBusy");
    auto* const consume = FindFunction<decltype(PQconsumeInput)>("PQconsumeInput");
    auto* const get = FindFunction<decltype(PQgetResult)>("PQgetResult");
    auto* const clear = FindFunction<decltype(PQclear)>("PQclear");
    PGconn* connection = static_cast<soci::postgresql_session_backend*>(sql.get_backend())->conn_;
    if (FindFunction<decltype(PQsendQuery)>("PQsendQuery")(connection, statement) == 0) {
        return std::nullopt;
    }
    const Clock::time_point deadline = Clock::now() + limit;
    pollfd socket{FindFunction<decltype(PQsocket)>("PQsocket")(connection), POLLIN, 0};
    const auto arrives = [&] {
        while (is_busy(connection) != 0) {
            const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
            if (left.count() <= 0 || ::poll(&socket, 1, static_cast<int>(left.count())) != 1 ||
                consume(connection) == 0) {
                return false;
            }
        }
        return true;
    };
    std::optional<std::string> value;
    while (arrives()) {
        const Result result(get(connection), clear);
        if (result == nullptr) {
            return value;  // only now does the connection take another statement
        }
        if (!value && FindFunction<decltype(PQntuples)>("PQntuples")(result.get()) > 0) {
            value = FindFunction<decltype(PQgetvalue)>("PQgetvalue")(result.get(), 0, 0);
        }
    }
    return std::nullopt;
}

void PrepareEngine(const std::string& url) {
    if (StoreAddress::Parse(url).engine == Engine::kPostgresql) {
        Postgresql();
    } else {
        WarmUpSqlite();
    }
}

}  // namespace lookhaven::store
