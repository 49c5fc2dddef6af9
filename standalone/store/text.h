// SPDX-License-Identifier: Apache-2.0
//
// Which text may go into a record: both engines store whatever passes here.
#pragma once

#include <cstddef>
#include <string_view>

namespace lookhaven::store {

// Valid UTF-8 of at most that many bytes, without control characters. Empty text is plain.
bool IsPlainText(std::string_view text, std::size_t max_bytes);

// 1 to 64 ASCII letters, digits, ".", "_", "-", "@", the first a letter or digit, and not the reserved name.
bool IsAccountName(std::string_view name);

// The host's own name in the module's admission check: an account of that name would pass it.
bool IsReservedName(std::string_view name);

// The form of a stream's address: "<scheme>:<rest>", without account and password before its host. Any scheme will do.
bool IsSource(std::string_view source);

// PEM of at most 32,768 bytes, as much as a web server is given with: its first and its last line; what stands between
// them is for the TLS library to judge.
bool IsCertificate(std::string_view text);

}  // namespace lookhaven::store
