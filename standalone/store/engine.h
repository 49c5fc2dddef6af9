// SPDX-License-Identifier: Apache-2.0
//
// What a process loads and binds before its first store is open.
//
// Why so        The host forks a process for each request, most of which open the store. What they would all load, bind
//               and set up is done once before. And libpq brings thirty libraries, which would make up half of what
//               each fork copies, so it is loaded only for a store of PostgreSQL.
#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace soci {
class backend_factory;
class session;
}  // namespace soci

namespace lookhaven::store {

// Loads the client of PostgreSQL for the rest of the process's life. Throws StoreError.
const soci::backend_factory& Postgresql();

// Of a session of PostgreSQL: the first value of the statement's answer; nothing for an answer without rows, and for a
// failure. libpq has no time limit for answers: nothing either where it is not complete within this one. Close the
// session then, since the rest may still come. Throws StoreError.
std::optional<std::string> AskWithin(soci::session& sql, const char* statement, std::chrono::milliseconds limit);

// For a process that forks those which open the store of that URL. Opens nothing that outlives the call. Throws
// StoreError.
void PrepareEngine(const std::string& url);

}  // namespace lookhaven::store
