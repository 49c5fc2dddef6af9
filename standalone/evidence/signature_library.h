// SPDX-License-Identifier: Apache-2.0
//
// Ed25519 as a shared library, liblookhaven-signature.so, loaded when needed.
//
// Why so        OpenSSL would make every fork of the host more expensive, and only a request process that exports needs
//               it.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <string_view>

namespace lookhaven::evidence {

constexpr std::size_t kSignatureBytes = 64;
constexpr std::size_t kPublicKeyBytes = 113;  // in PEM format

struct Signature {
    std::string bytes = {};
    std::string public_key = {};  // of the key that made it, in PEM format
};

// Keys are Ed25519, in PEM format. Those that throw std::runtime_error say which file is no such key.
class SignatureLibrary {
  public:
    virtual ~SignatureLibrary() = default;

    // A new private key.
    virtual std::string MakeKey() const = 0;
    // By the private key in the file. Throw std::system_error when it cannot be read, std::runtime_error.
    virtual Signature Sign(const std::filesystem::path& key_file, std::string_view text) const = 0;
    virtual std::string PublicKeyOf(const std::filesystem::path& key_file) const = 0;
    // Whether the key that belongs to the public one signed exactly that text. False for what is no public key.
    virtual bool IsSignatureOf(std::string_view text, const Signature& signature) const = 0;
    // SHA-256 of the public key in DER format (SubjectPublicKeyInfo), 64 hexadecimal digits; empty for what is none.
    virtual std::string FingerprintOf(const std::string& public_key) const = 0;
};

// Loads it for the rest of the process's life. Throws std::runtime_error.
const SignatureLibrary& LoadSignatureLibrary();

}  // namespace lookhaven::evidence
