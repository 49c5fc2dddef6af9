// SPDX-License-Identifier: Apache-2.0
//
// The one place where SOCI and the difference between the two engines stand; included by this folder's sources only.
#pragma once

#include <memory>
#include <string>
#include <type_traits>
#include <utility>

#include <soci/soci.h>

#include "standalone/store/store.h"

namespace lookhaven::store {

enum class Engine { kSqlite, kPostgresql };

// Whether a power cut right after the change may lose it. Changes that come every second and that the next one repeats
// need not wait for the disk.
enum class Durability { kSafe, kLazy };

// A store's address, taken apart.
struct StoreAddress {
    Engine engine;
    std::string location;  // the file's path, or what PostgreSQL connects by

    // Throws StoreError for a text that is neither.
    static StoreAddress Parse(const std::string& url);
};

class Connection {
  public:
    // Opens the file or connects; an absent SQLite file would be created. Throws StoreError.
    explicit Connection(const StoreAddress& address);

    bool IsSqlite() const { return engine_ == Engine::kSqlite; }
    bool HasTable(const std::string& name);

    // Calls ask(session). Throws StoreError where the engine fails; its text never holds a bound value.
    template <typename Ask>
    auto Read(Ask&& ask) {
        try {
            return ask(session_);
        } catch (const soci::soci_error& error) {
            throw StoreError("the record store failed: " + error.get_error_message());
        }
    }

    // Calls change(session) inside a transaction that is taken back when change throws.
    template <typename Change>
    auto Write(Change&& change, Durability durability = Durability::kSafe) {
        return Read([&](soci::session& sql) {
            Transaction transaction(*this, durability);
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

  private:
    class Transaction {
      public:
        Transaction(Connection& connection, Durability durability);
        Transaction(const Transaction&) = delete;
        Transaction& operator=(const Transaction&) = delete;
        ~Transaction();
        void Commit();

      private:
        soci::session& session_;
        bool restore_sync_ = false;
        bool open_ = true;
    };

    Engine engine_;
    soci::session session_;
};

// The next id of "user", "camera", "event" or another counter of schema.cpp. Inside Write only; concurrent callers wait
// for each other until the commit.
int NextId(soci::session& sql, const std::string& counter);

// The first of that many ids in a row. Inside Write only.
int NextIds(soci::session& sql, const std::string& counter, int count);

// Throws NotFound. Inside Write only.
void RequireCameraRow(soci::session& sql, int id);

// Tells those who poll Settings::Revision() that cameras or settings changed. Inside Write only.
void RaiseRevision(soci::session& sql);

// Locks out concurrent migrations. Inside Write only.
void LockSchema(Connection& connection, soci::session& sql);

}  // namespace lookhaven::store
