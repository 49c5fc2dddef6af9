// SPDX-License-Identifier: Apache-2.0
//
// Gives each test an empty store of its own, on either engine.
#pragma once

#include <functional>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/store/cameras.h"
#include "standalone/store/connection.h"
#include "standalone/store/store.h"
#include "test/support/folder.h"

namespace lookhaven::store {

class EmptyStore : public testing::TestWithParam<Engine> {
  protected:
    EmptyStore();

    // The address of a store that is not there yet; the name is that of SQLite's file.
    std::string NewUrl(Engine engine, const std::string& name) const;
    // Reads and writes past the records' classes.
    std::string Ask(const std::string& query);
    void Force(const std::string& statement);
    // Runs the work in that many threads at once; a failure in any of them fails the test.
    static void InParallel(int threads, const std::function<void()>& work);

    test::TemporaryFolder folder_{"lookhaven store"};  // a path with a space
    std::string url_;
};

// A record of which one member is different.
template <typename Record, typename Member, typename Value>
Record With(Record record, Member Record::*member, Value value) {
    record.*member = value;
    return record;
}

class StoreTest : public EmptyStore {
  protected:
    StoreTest() : store_((Store::Migrate(url_), Store::Open(url_))) {}

    int AddCamera() { return Cameras(store_).Add({.name = "Gate", .profiles = {{.source = "test:mjpeg"}}}); }

    // The newest entries of the audit log, the last one first: action, object, and the record before and after.
    std::vector<std::string> Audited();

    // The same on a connection each.
    void InParallel(int connections, const std::function<void(Store&)>& work) {
        EmptyStore::InParallel(connections, [&] {
            Store store = Store::Open(url_);
            work(store);
        });
    }

    Store store_;
};

// Texts with zeros, quotes and bytes that are not UTF-8, as requests may hold them.
const std::vector<std::string> kHostileTexts = {"",
                                                std::string("a\0b", 3),
                                                "' or '1'='1",
                                                "x'; drop table users; --",
                                                "\xff\xfe",
                                                "\xed\xa0\x80",
                                                "\xc0\xaf",
                                                "\n",
                                                std::string(100'000, 'A'),
                                                "%",
                                                "\\",
                                                ":name",
                                                "$1"};

std::string EngineName(const testing::TestParamInfo<Engine>& info);

}  // namespace lookhaven::store

#define LOOKHAVEN_ON_BOTH_ENGINES(suite)                                                                               \
    INSTANTIATE_TEST_SUITE_P(, suite, testing::Values(Engine::kSqlite, Engine::kPostgresql), EngineName)
