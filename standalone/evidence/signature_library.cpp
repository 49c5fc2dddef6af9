// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/signature_library.h"

#include <memory>
#include <new>
#include <stdexcept>
#include <vector>

#include <fcntl.h>
#include <openssl/evp.h>
#include <openssl/pem.h>

#include "standalone/base/file.h"
#include "standalone/base/sha256.h"

namespace lookhaven::evidence {

namespace {

using Bio = std::unique_ptr<BIO, decltype(&BIO_free_all)>;
using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;
using Context = std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)>;

// An encrypted key is none; by default the library would ask the terminal for its password.
int NoPassword(char*, int, int, void*) {
    return -1;
}

bool IsEd25519(const Key& key) {
    return key && EVP_PKEY_get_id(key.get()) == EVP_PKEY_ED25519;
}

Key ReadPrivateKey(const std::filesystem::path& file) {
    const base::FileDescriptor opened = base::OpenFile(file, O_RDONLY);
    const Bio bio(BIO_new_fd(opened.Get(), BIO_NOCLOSE), BIO_free_all);
    Key key(bio ? PEM_read_bio_PrivateKey(bio.get(), nullptr, NoPassword, nullptr) : nullptr, EVP_PKEY_free);
    if (!IsEd25519(key)) {
        throw std::runtime_error(file.string() + " is not an Ed25519 key in PEM format");
    }
    return key;
}

// Null for what is none.
Key ReadPublicKey(const std::string& pem) {
    const Bio bio(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())), BIO_free_all);
    Key key(bio ? PEM_read_bio_PUBKEY(bio.get(), nullptr, NoPassword, nullptr) : nullptr, EVP_PKEY_free);
    return IsEd25519(key) ? std::move(key) : Key(nullptr, EVP_PKEY_free);
}

// What write(bio) puts out.
template <typename Write>
std::string TextOf(Write&& write) {
    const Bio bio(BIO_new(BIO_s_mem()), BIO_free_all);
    if (!bio || write(bio.get()) != 1) {
        throw std::bad_alloc();
    }
    char* text = nullptr;
    const long size = BIO_get_mem_data(bio.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

std::string PublicPem(const Key& key) {
    return TextOf([&key](BIO* bio) { return PEM_write_bio_PUBKEY(bio, key.get()); });
}

const unsigned char* Bytes(std::string_view text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}

class Library : public SignatureLibrary {
  public:
    std::string MakeKey() const override {
        const Key key(EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519"), EVP_PKEY_free);
        if (!key) {
            throw std::runtime_error("the cryptographic library makes no key");
        }
        return TextOf([&key](BIO* bio) {
            return PEM_write_bio_PrivateKey(bio, key.get(), nullptr, nullptr, 0, nullptr, nullptr);
        });
    }

    Signature Sign(const std::filesystem::path& key_file, std::string_view text) const override {
        const Key key = ReadPrivateKey(key_file);
        const Context context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
        std::vector<unsigned char> bytes(kSignatureBytes);
        std::size_t size = bytes.size();
        if (!context || EVP_DigestSignInit(context.get(), nullptr, nullptr, nullptr, key.get()) != 1 ||
            EVP_DigestSign(context.get(), bytes.data(), &size, Bytes(text), text.size()) != 1 ||
            size != kSignatureBytes) {
            throw std::runtime_error("the cryptographic library does not sign");
        }
        return {{bytes.begin(), bytes.end()}, PublicPem(key)};
    }

    std::string PublicKeyOf(const std::filesystem::path& key_file) const override {
        return PublicPem(ReadPrivateKey(key_file));
    }

    bool IsSignatureOf(std::string_view text, const Signature& signature) const override {
        const Key key = ReadPublicKey(signature.public_key);
        const Context context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
        return key && context && EVP_DigestVerifyInit(context.get(), nullptr, nullptr, nullptr, key.get()) == 1 &&
               EVP_DigestVerify(context.get(), Bytes(signature.bytes), signature.bytes.size(), Bytes(text),
                                text.size()) == 1;
    }

    std::string FingerprintOf(const std::string& public_key) const override {
        const Key key = ReadPublicKey(public_key);
        if (!key) {
            return "";
        }
        const std::string der = TextOf([&key](BIO* bio) { return i2d_PUBKEY_bio(bio, key.get()); });
        base::Sha256 hash;
        hash.Add(der.data(), der.size());
        return hash.Finish();
    }
};

}  // namespace

}  // namespace lookhaven::evidence

extern "C" __attribute__((visibility("default"))) const lookhaven::evidence::SignatureLibrary* LookhavenSignature() {
    static const lookhaven::evidence::Library library;
    return &library;
}
