// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/engine.h"

#include <utility>

#include <soci/sqlite3/soci-sqlite3.h>
#include <soci/version.h>

#include <dlfcn.h>

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

}  // namespace

const soci::backend_factory& Postgresql() {
    static const soci::backend_factory* const factory = [] {
        const std::string name = "libsoci_postgresql.so." + std::to_string(SOCI_VERSION / 100'000) + '.' +
                                 std::to_string(SOCI_VERSION / 100 % 1'000);
        void* library = ::dlopen(name.c_str(), RTLD_NOW | RTLD_LOCAL);
        void* get = library == nullptr ? nullptr : ::dlsym(library, "factory_postgresql");
        if (get == nullptr) {
            throw StoreError(std::string("cannot load the client of PostgreSQL: ") + ::dlerror());
        }
        return reinterpret_cast<const soci::backend_factory* (*)()>(get)();
    }();
    return *factory;
}

void PrepareEngine(const std::string& url) {
    if (StoreAddress::Parse(url).engine == Engine::kPostgresql) {
        Postgresql();
    } else {
        WarmUpSqlite();
    }
}

}  // namespace lookhaven::store
