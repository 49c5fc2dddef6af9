// SPDX-License-Identifier: Apache-2.0
//
// What a process loads and binds before its first store is open, and what of libpq SOCI does not offer.
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

// Of a session of PostgreSQL: the first value of the statement's answer. Nothing for an answer without rows, for a
// failure, and where the answer is not complete within the limit, for which libpq has none. Close the session after
// nothing: the rest of the answer may still arrive. Throws StoreError.
std::optional<std::string> AskWithin(soci::session& sql, const char* statement, std::chrono::milliseconds limit);

// For a process that forks those which open the store of that URL. Opens nothing that outlives the call. Throws
// StoreError.
void PrepareEngine(const std::string& url);

}  // namespace lookhaven::store
