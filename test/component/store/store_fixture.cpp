// SPDX-License-Identifier: Apache-2.0
#include "test/component/store/store_fixture.h"

#include "standalone/store/audit_log.h"

#include <exception>
#include <latch>

#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::store {

EmptyStore::EmptyStore() : url_(NewUrl(GetParam(), "lookhaven.db")) {}

std::string EmptyStore::NewUrl(Engine engine, const std::string& name) const {
    if (engine == Engine::kPostgresql) {
        static test::TemporaryPostgres server;
        return server.NewDatabase();
    }
    return "sqlite:" + (folder_ / name).string();
}

std::string EmptyStore::Ask(const std::string& query) {
    std::string answer;
    Connection(StoreAddress::Parse(url_)).Read([&](soci::session& sql) { sql << query, soci::into(answer); });
    return answer;
}

void EmptyStore::Force(const std::string& statement) {
    Connection(StoreAddress::Parse(url_)).Write([&](soci::session& sql) { sql << statement; });
}

void EmptyStore::InParallel(int threads, const std::function<void()>& work) {
    std::latch start(threads);
    std::vector<std::string> failures(static_cast<std::size_t>(threads));
    std::vector<std::jthread> running;
    for (std::string& failure : failures) {
        running.emplace_back([&] {
            try {
                start.arrive_and_wait();
                work();
            } catch (const std::exception& error) {
                failure = error.what();
            }
        });
    }
    running.clear();
    EXPECT_THAT(failures, testing::Each(""));
}

std::string EngineName(const testing::TestParamInfo<Engine>& info) {
    return info.param == Engine::kSqlite ? "Sqlite" : "Postgresql";
}

std::vector<std::string> StoreTest::Audited() {
    std::vector<std::string> entries;
    for (const AuditEntry& entry : AuditLog(store_).List(0, 20)) {
        entries.push_back(entry.action + " " + entry.object + " " + entry.before + " " + entry.after);
    }
    return entries;
}

}  // namespace lookhaven::store
