// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/sha256.h"

#include <array>

#include <sodium.h>

#include "standalone/base/text.h"

namespace lookhaven::base {

static_assert(kSha256Digits == 2 * crypto_hash_sha256_BYTES);

Sha256::Sha256() : state_(std::make_unique<crypto_hash_sha256_state>()) {
    crypto_hash_sha256_init(state_.get());
}

Sha256::~Sha256() = default;

void Sha256::Add(const void* data, std::size_t size) {
    crypto_hash_sha256_update(state_.get(), static_cast<const unsigned char*>(data), size);
}

std::string Sha256::Finish() {
    std::array<unsigned char, crypto_hash_sha256_BYTES> hash{};
    crypto_hash_sha256_final(state_.get(), hash.data());
    return ToHex(hash);
}

}  // namespace lookhaven::base
