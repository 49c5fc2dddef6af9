// SPDX-License-Identifier: Apache-2.0
#include "test/component/store/store_fixture.h"

#include <exception>
#include <latch>

#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::store {

EmptyStore::EmptyStore() {
    if (GetParam() == Engine::kPostgresql) {
        static test::TemporaryPostgres server;
        url_ = server.NewDatabase();
        return;
    }
    url_ = "sqlite:" + (folder_ / "lookhaven.db").string();
}

std::string EmptyStore::Ask(const std::string& query) {
    std::string answer;
    Connection(StoreAddress::Parse(url_)).Read([&](soci::session& sql) { sql << query, soci::into(answer); });
    return answer;
}

void EmptyStore::Force(const std::string& statement) {
    Connection(StoreAddress::Parse(url_)).Write([&](soci::session& sql) { sql << statement; });
}

void StoreTest::InParallel(int connections, const std::function<void(Store&)>& work) {
    std::latch start(connections);
    std::vector<std::string> failures(static_cast<std::size_t>(connections));
    std::vector<std::thread> threads;
    for (std::string& failure : failures) {
        threads.emplace_back([&] {
            try {
                start.arrive_and_wait();
                Store store = Store::Open(url_);
                work(store);
            } catch (const std::exception& error) {
                failure = error.what();
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_THAT(failures, testing::Each(""));
}

std::string EngineName(const testing::TestParamInfo<Engine>& info) {
    return info.param == Engine::kSqlite ? "Sqlite" : "Postgresql";
}

}  // namespace lookhaven::store
