// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/secret.h"

#include <array>
#include <new>
#include <stdexcept>
#include <vector>

#include <sodium.h>

#include "standalone/base/text.h"

namespace lookhaven::store {

namespace {

// The hash of a password that nobody knows. A literal, since computing one at the first unknown name would take twice
// as long as verifying a known one, and so tell them apart.
constexpr const char* kDummyHash =
    "$argon2id$v=19$m=65536,t=2,p=1$hV8m1iLSluiSrYIMrSKeag$DXWqEsUIys7oW/dbZ40036DcKkJgYYcDjGgiiJ9xt5g";

void InitialiseSodium() {
    if (sodium_init() < 0) {
        throw std::runtime_error("the cryptographic library does not start");
    }
}

const unsigned char* Bytes(std::string_view text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}

std::string Hash(std::string_view key, std::string_view text) {
    InitialiseSodium();
    std::array<unsigned char, 32> hash{};
    if (crypto_generichash(hash.data(), hash.size(), Bytes(text), text.size(), Bytes(key), key.size()) != 0) {
        throw std::invalid_argument("a key has 16 to 64 bytes");
    }
    return base::ToHex(hash);
}

bool AreEqual(std::string_view given, const std::string& expected) {
    return given.size() == expected.size() && sodium_memcmp(given.data(), expected.data(), given.size()) == 0;
}

}  // namespace

std::string HashPassword(std::string_view password) {
    InitialiseSodium();
    std::array<char, crypto_pwhash_STRBYTES> hash{};
    if (crypto_pwhash_str(hash.data(), password.data(), password.size(), crypto_pwhash_OPSLIMIT_INTERACTIVE,
                          crypto_pwhash_MEMLIMIT_INTERACTIVE) != 0) {
        throw std::bad_alloc();
    }
    return hash.data();
}

bool PasswordMatches(const std::optional<std::string>& hash, std::string_view password) {
    InitialiseSodium();
    const char* expected = hash ? hash->c_str() : kDummyHash;
    const bool matches = crypto_pwhash_str_verify(expected, password.data(), password.size()) == 0;
    return hash && matches;
}

std::string RandomHex(std::size_t size_bytes) {
    InitialiseSodium();
    std::vector<unsigned char> bytes(size_bytes);
    randombytes_buf(bytes.data(), bytes.size());
    return base::ToHex(bytes);
}

std::string Digest(std::string_view text) {
    return Hash({}, text);
}

std::string Tag(std::string_view key, std::string_view text) {
    return Hash(key, text).substr(0, kTagDigits);
}

bool TagMatches(std::string_view key, std::string_view text, std::string_view tag) {
    return AreEqual(tag, Tag(key, text));
}

std::string NewSecret(std::string_view key) {
    const std::string random = RandomHex(kRandomDigits / 2);
    return random + Tag(key, random);
}

bool DigestMatches(std::string_view digest, std::string_view text) {
    return AreEqual(digest, Digest(text));
}

}  // namespace lookhaven::store
