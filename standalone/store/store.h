// SPDX-License-Identifier: Apache-2.0
//
// One connection to the record store: accounts, cameras, recorded events, e-maps and all else that is kept as records.
//
// Why so        A request process opens the store, asks a few questions and closes it, so opening is cheap and does no
//               more than check that the schema is the one this program knows. Most statements are the same for SQLite
//               and PostgreSQL; they differ in the steps of the schema, and where IsSqlite() is asked.
// Thread safety One Store per thread. Any number of processes. A Store must not be used across fork().
// Failures      Besides what its declaration names, every function of a record class throws StoreError. Whatever it
//               throws, a change is made whole or not at all, unless its declaration says otherwise. Times are UTC
//               seconds since the epoch and come from the caller.
// See           cameras.h, events.h, users.h and the other headers of this folder: a class for each kind of record.
#pragma once

#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace lookhaven::store {

// The store cannot be reached, failed, or was locked by other writers for five seconds. A change that failed so was not
// made, unless the connection broke during its commit: look before repeating an Add. A Store that has lost its server
// stays broken: open another one.
class StoreError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// The database server cannot be connected to, or the connection to it was lost: what fails for that alone may be tried
// again.
class StoreUnavailable : public StoreError {
  public:
    using StoreError::StoreError;
};

// The schema is missing, older or newer than this program's; the text says what to do.
class SchemaError : public StoreError {
  public:
    using StoreError::StoreError;
};

// The caller's record breaks a rule, which the text names; nothing was changed.
class InvalidRecord : public std::invalid_argument {
  public:
    using std::invalid_argument::invalid_argument;
};

// There is such a record already; nothing was changed.
class AlreadyExists : public InvalidRecord {
  public:
    using InvalidRecord::InvalidRecord;
};

// There is no such record; nothing was changed.
class NotFound : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// Someone else changed the record since it was read; nothing was changed.
class Conflict : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

class Connection;

class Store {
  public:
    // url: "sqlite:<path>", "postgresql://…" or "postgresql:<connection options>". Throws SchemaError when the store
    // was not set up by this version, or by a newer one that leaves it to this one as well; StoreError when it cannot
    // be opened. Creates nothing.
    static Store Open(const std::string& url);

    // Brings the store to this program's schema, from nothing or from any older version, in one transaction; returns
    // the number of steps taken, 0 when there was nothing to do. Throws as Open for one of a newer program. A new SQLite
    // file is private to its owner.
    static int Migrate(const std::string& url);

    // Copies a SQLite store that an older program made, without its sessions, to the private file
    // lookhaven.db.schema-<its version> in the folder, which it replaces: the way back to that program, after Migrate.
    // kAhead: while that program still runs, so that a call with kNow within a quarter of an hour has nothing to
    // copy. False, with nothing done, for any other store: PostgreSQL's is its operator's to back up. Throws
    // StoreError, also where Migrate would then lack room, and leaves the file as it was.
    enum class Copy { kNow, kAhead };
    static bool CopyIfOlder(const std::string& url, const std::filesystem::path& folder, Copy when = Copy::kNow);

    // A file of one machine, as opposed to a server that several can reach.
    bool IsSqlite() const;

    // The schema version this program needs.
    static int SchemaVersion();

    // Whether Open would take the store still. False also where it cannot be read, where its server does not answer
    // within two seconds, and where that server is read-only: an address may name several.
    bool IsUpToDate();

    Store(Store&&) noexcept;
    Store& operator=(Store&&) noexcept;
    ~Store();

    // What is wrong with the stored data, a sentence each; empty when it is sound. Reads all of a SQLite file.
    std::vector<std::string> Check();

    // For the record classes of this folder.
    Connection& connection() { return *connection_; }

  private:
    explicit Store(std::unique_ptr<Connection> connection);

    std::unique_ptr<Connection> connection_;
};

}  // namespace lookhaven::store
