// SPDX-License-Identifier: Apache-2.0
//
// A connection, the differences between the two engines, and what several records share. For this folder's sources.
#pragma once

#include <optional>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include <soci/soci.h>

#include "standalone/store/query.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

enum class Engine { kSqlite, kPostgresql };

// Whether a power cut right after a change may lose it. A change that comes every second, and that the next one
// supersedes, need not wait for the disk.
enum class Durability { kSafe, kLazy };

// Whether a change waits for another writer, or fails at once: what can as well be done later must not hold up a
// request.
enum class LockWait { kUsual, kNone };

// A store's URL, parsed.
struct StoreAddress {
    Engine engine;
    std::string location;  // the file's path, or PostgreSQL's URL or connection options

    // Throws StoreError for a URL of neither engine.
    static StoreAddress Parse(const std::string& url);
};

class Connection {
  public:
    // Opens the file or connects; creates an absent SQLite file. Throws StoreError, of a server StoreUnavailable.
    explicit Connection(const StoreAddress& address);

    bool IsSqlite() const { return engine_ == Engine::kSqlite; }
    bool HasTable(const std::string& name);

    // Calls ask(session). Throws StoreError where the engine fails, StoreUnavailable where its server is gone; the text
    // never holds a parameter's value.
    template <typename Ask>
    auto Read(Ask&& ask) {
        try {
            return ask(session_);
        } catch (const soci::soci_error& error) {
            Fail(error);
        } catch (const std::bad_optional_access&) {
            throw StoreError("the record store is damaged: a row that is always there is missing");
        }
    }

    // Calls change(session) inside a transaction, which is rolled back when change throws. Inside another Write it is a
    // part of that one, and what it throws must end that one.
    template <typename Change>
    auto Write(Change&& change, Durability durability = Durability::kSafe, LockWait lock_wait = LockWait::kUsual) {
        return Read([&](soci::session& sql) {
            Transaction transaction(*this, durability, lock_wait);
            if constexpr (std::is_void_v<decltype(change(sql))>) {
                change(sql);
                transaction.Commit();
            } else {
                auto result = change(sql);
                transaction.Commit();
                return result;
            }
        });
    }

    // Calls ask(session), to which the store stays as it is at one moment while others go on changing it. On PostgreSQL
    // put no condition on start_s: to such a session, rows that were moved to a new partition meanwhile are still in the
    // default one, which the planner would leave out. Not inside another, nor inside Write.
    template <typename Ask>
    auto ReadAtOneMoment(Ask&& ask) {
        return Read([&](soci::session& sql) {
            const Snapshot snapshot(*this);
            return ask(sql);
        });
    }

    // As the functions of query.h, each in a Read of its own.
    template <typename Row, typename... Parameter>
    std::optional<Row> FetchOne(const std::string& text, const Parameter&... parameters) {
        return Read([&](soci::session& sql) { return store::FetchOne<Row>(sql, text, parameters...); });
    }
    template <typename Row, typename Rows = std::vector<Row>, typename... Parameter>
    Rows FetchAll(const std::string& text, const Parameter&... parameters) {
        return Read([&](soci::session& sql) { return store::FetchAll<Row, Rows>(sql, text, parameters...); });
    }
    // Likewise, in a Write of its own.
    template <typename... Parameter>
    int Execute(const std::string& text, const Parameter&... parameters) {
        return Write([&](soci::session& sql) { return store::Execute(sql, text, parameters...); });
    }

  private:
    [[noreturn]] void Fail(const soci::soci_error& error) const;

    class Transaction {
      public:
        Transaction(Connection& connection, Durability durability, LockWait lock_wait);
        Transaction(const Transaction&) = delete;
        Transaction& operator=(const Transaction&) = delete;
        ~Transaction();
        void Commit();

      private:
        explicit Transaction(Connection& connection);
        void SetUntilEnd(const std::string& setting, const std::string& value, const std::string& usual_value);

        soci::session& session_;
        int& open_transactions_;
        const bool is_part_;
        std::vector<std::string> restore_;
        bool is_open_ = false;
    };

    class Snapshot {
      public:
        explicit Snapshot(Connection& connection);
        Snapshot(const Snapshot&) = delete;
        Snapshot& operator=(const Snapshot&) = delete;
        ~Snapshot();

      private:
        soci::session& session_;
    };

    Engine engine_;
    std::string file_;  // of SQLite
    soci::session session_;
    int open_transactions_ = 0;
};

// The next id of "user", "camera", "event" or another counter of schema.cpp. Inside Write only; concurrent callers wait
// for each other until the commit.
int NextId(soci::session& sql, const std::string& counter);

// The first of that many consecutive ids. Inside Write only.
int NextIds(soci::session& sql, const std::string& counter, int count);

[[noreturn]] void ThrowNotFound(const std::string& what, int id);

// What was found. Throws NotFound, "there is no <what> <id>", for nothing.
template <typename Found>
Found Require(std::optional<Found> found, const std::string& what, int id) {
    if (!found) {
        ThrowNotFound(what, id);
    }
    return *std::move(found);
}

// Throws NotFound.
void RequireCameraRow(soci::session& sql, int id);

// Throws InvalidRecord for what is no name of 1 to 64 bytes, AlreadyExists for that of another record of the table.
// what: "an e-map", for the message. Inside Write only.
void RequireFreeName(soci::session& sql, const std::string& table, const std::string& what, int id,
                     const std::string& name);

// Tells those who poll Settings::Revision() that cameras or settings changed. Inside Write only.
void RaiseRevision(soci::session& sql);

// Locks out concurrent migrations, and work on partitions. Inside Write only.
void LockSchema(Connection& connection, soci::session& sql);

}  // namespace lookhaven::store
