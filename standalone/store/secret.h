// SPDX-License-Identifier: Apache-2.0
//
// Passwords and tokens, on libsodium.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace lookhaven::store {

// argon2id, with salt and cost parameters in the text. Throws std::bad_alloc when 64 MiB are not available.
std::string HashPassword(std::string_view password);

// Without a hash false, after the same work as with one: the time taken must not reveal whether an account exists.
bool PasswordMatches(const std::optional<std::string>& hash, std::string_view password);

// Random bytes from the operating system's generator, two hex digits each.
std::string RandomHex(std::size_t size_bytes);

// BLAKE2b-256, 64 hex digits.
std::string Digest(std::string_view text);

// Keyed BLAKE2b, the first kTagDigits hex digits. Only a holder of the key (16 to 64 bytes) can make it.
constexpr std::size_t kTagDigits = 16;
std::string Tag(std::string_view key, std::string_view text);

// Takes the same time wherever the tag differs.
bool TagMatches(std::string_view key, std::string_view text, std::string_view tag);

// 64 hex digits: random ones, and behind them their tag.
constexpr std::size_t kSecretDigits = 64;
constexpr std::size_t kRandomDigits = kSecretDigits - kTagDigits;
std::string NewSecret(std::string_view key);

// Takes the same time wherever the digest differs.
bool DigestMatches(std::string_view digest, std::string_view text);

}  // namespace lookhaven::store
