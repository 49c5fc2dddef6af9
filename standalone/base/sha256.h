// SPDX-License-Identifier: Apache-2.0
//
// SHA-256 of data that arrives in pieces.
#pragma once

#include <cstddef>
#include <memory>
#include <string>

struct crypto_hash_sha256_state;

namespace lookhaven::base {

constexpr std::size_t kSha256Digits = 64;

class Sha256 {
  public:
    Sha256();
    Sha256(const Sha256&) = delete;
    Sha256& operator=(const Sha256&) = delete;
    ~Sha256();

    void Add(const void* data, std::size_t size);
    // In hexadecimal digits, in lower case. Call it once; nothing can be added afterwards.
    std::string Finish();

  private:
    std::unique_ptr<crypto_hash_sha256_state> state_;
};

}  // namespace lookhaven::base
