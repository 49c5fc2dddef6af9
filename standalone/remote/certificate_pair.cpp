// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/certificate_pair.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <memory>
#include <string_view>
#include <vector>

#include <openssl/bn.h>
#include <openssl/core_names.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

namespace lookhaven::remote {

namespace {

using Bio = std::unique_ptr<BIO, decltype(&BIO_free_all)>;
using Certificate = std::unique_ptr<X509, decltype(&X509_free)>;
using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;
using KeyContext = std::unique_ptr<EVP_PKEY_CTX, decltype(&EVP_PKEY_CTX_free)>;

constexpr std::size_t kMaxCertificates = 8;
constexpr int kMinRsaBits = 2048;
constexpr int kMaxRsaBits = 8192;
constexpr std::array<std::string_view, 2> kCurves = {"prime256v1", "secp384r1"};

// By default the library would ask the terminal.
int NoPassword(char*, int, int, void*) {
    return -1;
}

Bio Open(const std::string& pem) {
    return {BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())), BIO_free_all};
}

std::vector<Certificate> ReadChain(const std::string& pem) {
    const Bio bio = Open(pem);
    std::vector<Certificate> chain;
    for (;;) {
        ERR_clear_error();
        Certificate next(PEM_read_bio_X509(bio.get(), nullptr, NoPassword, nullptr), X509_free);
        if (!next) {
            break;
        }
        chain.push_back(std::move(next));
        if (chain.size() > kMaxCertificates) {
            throw InvalidCertificate("there are more than " + std::to_string(kMaxCertificates) + " certificates");
        }
    }
    const bool is_at_end = ERR_GET_REASON(ERR_peek_last_error()) == PEM_R_NO_START_LINE;
    ERR_clear_error();
    if (!is_at_end) {
        throw InvalidCertificate("certificate " + std::to_string(chain.size() + 1) + " of the file is damaged");
    }
    if (chain.empty()) {
        throw InvalidCertificate("there is no certificate in PEM format");
    }
    return chain;
}

std::string NameOf(std::size_t index) {
    return index == 0 ? "the certificate" : "certificate " + std::to_string(index + 1) + " of the file";
}

void RequireValidNow(const std::vector<Certificate>& chain, std::int64_t now_s) {
    for (std::size_t i = 0; i < chain.size(); ++i) {
        auto now = static_cast<std::time_t>(now_s);
        // 0 where the certificate's time cannot be read.
        if (const int end = X509_cmp_time(X509_get0_notAfter(chain[i].get()), &now); end <= 0) {
            throw InvalidCertificate(NameOf(i) + (end == 0 ? " names no end of its validity" : " has expired"));
        }
        if (X509_cmp_time(X509_get0_notBefore(chain[i].get()), &now) >= 0) {
            throw InvalidCertificate(NameOf(i) + " is not valid yet");
        }
    }
}

void RequireOrder(const std::vector<Certificate>& chain) {
    for (std::size_t i = 0; i + 1 < chain.size(); ++i) {
        X509* const issuer = chain[i + 1].get();
        if (X509_check_issued(issuer, chain[i].get()) != X509_V_OK ||
            X509_verify(chain[i].get(), X509_get0_pubkey(issuer)) != 1) {
            throw InvalidCertificate(NameOf(i + 1) +
                                     " is not the issuer of the one before: the server's own comes first, "
                                     "then each one's issuer");
        }
    }
}

// What it names, certificate.h says of CertificateName: paired hosts ask for it by that.
void RequireServer(const std::vector<Certificate>& chain, const std::string& pem) {
    if (X509_check_purpose(chain.front().get(), X509_PURPOSE_SSL_SERVER, 0) != 1) {
        throw InvalidCertificate("the certificate is for something else than a web server");
    }
    CertificateName(pem);
}

bool IsFactor(const EVP_PKEY* key, const char* name) {
    BIGNUM* factor = nullptr;
    const bool has_it = EVP_PKEY_get_bn_param(key, name, &factor) == 1;
    const bool is_one = has_it && BN_num_bits(factor) < EVP_PKEY_get_bits(key);
    BN_clear_free(factor);
    return is_one;
}

// The size of the factors decides how long testing them for primality takes: it must not be an attacker's choice.
bool HasUsableFactors(const EVP_PKEY* key) {
    BIGNUM* third = nullptr;
    const bool has_third = EVP_PKEY_get_bn_param(key, OSSL_PKEY_PARAM_RSA_FACTOR3, &third) == 1;
    BN_clear_free(third);
    return !has_third && IsFactor(key, OSSL_PKEY_PARAM_RSA_FACTOR1) && IsFactor(key, OSSL_PKEY_PARAM_RSA_FACTOR2);
}

bool IsUsableKind(const EVP_PKEY* key) {
    if (EVP_PKEY_is_a(key, "RSA") == 1) {
        return EVP_PKEY_get_bits(key) >= kMinRsaBits && EVP_PKEY_get_bits(key) <= kMaxRsaBits;
    }
    std::array<char, 64> curve{};
    std::size_t length = 0;
    return EVP_PKEY_is_a(key, "EC") == 1 && EVP_PKEY_get_group_name(key, curve.data(), curve.size(), &length) == 1 &&
           std::ranges::find(kCurves, std::string_view(curve.data(), length)) != kCurves.end();
}

Key ReadKey(const std::string& pem) {
    Key key(PEM_read_bio_PrivateKey(Open(pem).get(), nullptr, NoPassword, nullptr), EVP_PKEY_free);
    ERR_clear_error();
    if (key) {
        return key;
    }
    if (pem.find("ENCRYPTED") != pem.npos) {
        throw InvalidCertificate("the key is encrypted with a password: give it without one");
    }
    throw InvalidCertificate("there is no private key in PEM format, or it is damaged");
}

// Checks the kind first, so that the checks after it take a bounded time.
void RequireKeyOf(X509* certificate, EVP_PKEY* key) {
    if (!IsUsableKind(X509_get0_pubkey(certificate)) || !IsUsableKind(key)) {
        throw InvalidCertificate(
            "the key is of a kind that not all browsers know: it must be RSA with 2048 to 8192 bits, or of the "
            "elliptic curve P-256 or P-384");
    }
    if (X509_check_private_key(certificate, key) != 1) {
        ERR_clear_error();
        throw InvalidCertificate("the key is that of another certificate");
    }
    const KeyContext context(EVP_PKEY_CTX_new(key, nullptr), EVP_PKEY_CTX_free);
    if (!context || (EVP_PKEY_is_a(key, "RSA") == 1 && !HasUsableFactors(key)) ||
        EVP_PKEY_pairwise_check(context.get()) != 1) {
        ERR_clear_error();
        throw InvalidCertificate("the key is damaged: its private half is of another key");
    }
}

std::string TextOf(EVP_PKEY* key) {
    const Bio out(BIO_new(BIO_s_secmem()), BIO_free_all);
    if (!out || PEM_write_bio_PrivateKey(out.get(), key, nullptr, nullptr, 0, NoPassword, nullptr) != 1) {
        throw std::bad_alloc();
    }
    char* text = nullptr;
    const long size = BIO_get_mem_data(out.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

}  // namespace

CertificatePair ReadCertificatePair(const std::string& chain_pem, const std::string& key_pem, std::int64_t now_s) {
    if (chain_pem.size() > kMaxChainBytes || key_pem.size() > kMaxKeyBytes) {
        throw InvalidCertificate("the certificates may have " + std::to_string(kMaxChainBytes) +
                                 " bytes, and the key " + std::to_string(kMaxKeyBytes));
    }
    const std::vector<Certificate> chain = ReadChain(chain_pem);
    RequireValidNow(chain, now_s);
    RequireOrder(chain);
    CertificatePair pair;
    pair.certificates = CertificatesIn(chain_pem);
    RequireServer(chain, pair.certificates);
    const Key key = ReadKey(key_pem);
    RequireKeyOf(chain.front().get(), key.get());
    pair.key = TextOf(key.get());
    pair.facts = ReadCertificate(pair.certificates);
    return pair;
}

bool IsTrustedThrough(const std::string& known_pem, const std::string& chain_pem) try {
    const std::vector<Certificate> known = ReadChain(known_pem);
    const std::vector<Certificate> chain = ReadChain(chain_pem);
    const std::unique_ptr<X509_STORE, decltype(&X509_STORE_free)> store(X509_STORE_new(), X509_STORE_free);
    const std::unique_ptr<X509_STORE_CTX, decltype(&X509_STORE_CTX_free)> context(X509_STORE_CTX_new(),
                                                                                  X509_STORE_CTX_free);
    const std::unique_ptr<STACK_OF(X509), void (*)(STACK_OF(X509)*)> shown(
        sk_X509_new_null(), [](STACK_OF(X509) * stack) { sk_X509_free(stack); });
    if (!store || !context || !shown) {
        throw std::bad_alloc();
    }
    for (const Certificate& each : known) {
        X509_STORE_add_cert(store.get(), each.get());
    }
    for (const Certificate& each : chain) {
        sk_X509_push(shown.get(), each.get());
    }
    X509_STORE_set_flags(store.get(), X509_V_FLAG_PARTIAL_CHAIN);
    const std::string host = CertificateName(known_pem);
    const bool is_trusted = X509_STORE_CTX_init(context.get(), store.get(), chain.front().get(), shown.get()) == 1 &&
                            X509_verify_cert(context.get()) == 1 &&
                            X509_check_host(chain.front().get(), host.data(), host.size(), 0, nullptr) == 1;
    ERR_clear_error();
    return is_trusted;
} catch (const InvalidCertificate&) {
    return false;
}

}  // namespace lookhaven::remote
