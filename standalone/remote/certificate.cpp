// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/certificate.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <iterator>
#include <memory>
#include <string_view>
#include <utility>

#include <arpa/inet.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

namespace lookhaven::remote {

namespace {

using Bio = std::unique_ptr<BIO, decltype(&BIO_free_all)>;
using Certificate = std::unique_ptr<X509, decltype(&X509_free)>;
using Names = std::unique_ptr<GENERAL_NAMES, decltype(&GENERAL_NAMES_free)>;

// Null at the end.
Certificate ReadNext(const Bio& bio) {
    // An encrypted block is none; by default the library would ask the terminal for its password.
    const auto no_password = [](char*, int, int, void*) { return -1; };
    return {PEM_read_bio_X509(bio.get(), nullptr, no_password, nullptr), X509_free};
}

Bio Open(const std::string& pem) {
    return {BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())), BIO_free_all};
}

Certificate RequireFirst(const Bio& bio) {
    Certificate certificate = ReadNext(bio);
    if (!certificate) {
        throw InvalidCertificate("there is no certificate in PEM format");
    }
    return certificate;
}

bool IsPrintable(char c) {
    return c > ' ' && c <= '~';
}

std::string TextOf(const ASN1_STRING* text) {
    return {reinterpret_cast<const char*>(ASN1_STRING_get0_data(text)),
            static_cast<std::size_t>(ASN1_STRING_length(text))};
}

// Empty for what is no address.
std::string AddressText(const ASN1_OCTET_STRING* bytes) {
    char text[INET6_ADDRSTRLEN];
    const int family = ASN1_STRING_length(bytes) == 4 ? AF_INET : ASN1_STRING_length(bytes) == 16 ? AF_INET6 : 0;
    return family != 0 && ::inet_ntop(family, ASN1_STRING_get0_data(bytes), text, sizeof text) != nullptr ? text : "";
}

std::vector<std::string> NamesOf(const X509* certificate, int type) {
    const Names all(static_cast<GENERAL_NAMES*>(X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)),
                    GENERAL_NAMES_free);
    std::vector<std::string> names;
    for (int i = 0; all && i < sk_GENERAL_NAME_num(all.get()); ++i) {
        if (const GENERAL_NAME* name = sk_GENERAL_NAME_value(all.get(), i); name->type == type) {
            names.push_back(type == GEN_DNS ? TextOf(name->d.dNSName) : AddressText(name->d.iPAddress));
        }
    }
    return names;
}

std::string CommonName(const X509* certificate) {
    X509_NAME* subject = X509_get_subject_name(certificate);
    const int at = X509_NAME_get_index_by_NID(subject, NID_commonName, -1);
    return at < 0 ? "" : TextOf(X509_NAME_ENTRY_get_data(X509_NAME_get_entry(subject, at)));
}

std::string SubjectOf(const X509* certificate) {
    const Bio out(BIO_new(BIO_s_mem()), BIO_free_all);
    constexpr unsigned long kFlags = XN_FLAG_RFC2253 & ~static_cast<unsigned long>(ASN1_STRFLGS_ESC_MSB);
    if (!out || X509_NAME_print_ex(out.get(), X509_get_subject_name(certificate), 0, kFlags) < 0) {
        throw InvalidCertificate("the certificate's subject cannot be read");
    }
    char* text = nullptr;
    const long size = BIO_get_mem_data(out.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

std::string FingerprintOf(const X509* certificate) {
    constexpr std::string_view kDigits = "0123456789ABCDEF";
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
    unsigned int size = 0;
    if (X509_digest(certificate, EVP_sha256(), digest.data(), &size) != 1) {
        throw InvalidCertificate("the certificate's fingerprint cannot be computed");
    }
    std::string text;
    for (unsigned int i = 0; i < size; ++i) {
        text += text.empty() ? "" : ":";
        text += {kDigits[digest[i] >> 4], kDigits[digest[i] & 15]};
    }
    return text;
}

}  // namespace

std::string CertificatesIn(const std::string& pem) {
    const Bio in = Open(pem);
    const Bio out(BIO_new(BIO_s_mem()), BIO_free_all);
    for (Certificate certificate = RequireFirst(in); certificate; certificate = ReadNext(in)) {
        if (!out || PEM_write_bio_X509(out.get(), certificate.get()) != 1) {
            throw std::bad_alloc();
        }
    }
    char* text = nullptr;
    const long size = BIO_get_mem_data(out.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

std::string CertificateName(const std::string& pem) {
    const Certificate certificate = RequireFirst(Open(pem));
    const std::vector<std::string> names = NamesOf(certificate.get(), GEN_DNS);
    std::string name = names.empty() ? CommonName(certificate.get()) : names.front();
    if (name.starts_with("*.")) {
        name.replace(0, 1, "host");
    }
    // The name becomes part of an address.
    if (name.empty() || name.size() > 253 ||
        name.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789.-_") != name.npos) {
        throw InvalidCertificate("the certificate names no valid host");
    }
    return name;
}

CertificateFacts ReadCertificate(const std::string& pem) {
    const Certificate certificate = RequireFirst(Open(pem));
    std::tm end{};
    if (ASN1_TIME_to_tm(X509_get0_notAfter(certificate.get()), &end) != 1) {
        throw InvalidCertificate("the certificate names no end of its validity");
    }
    std::vector<std::string> names = NamesOf(certificate.get(), GEN_DNS);
    std::ranges::move(NamesOf(certificate.get(), GEN_IPADD), std::back_inserter(names));
    std::erase_if(names,
                  [](const std::string& name) { return name.empty() || !std::ranges::all_of(name, IsPrintable); });
    return {SubjectOf(certificate.get()), FingerprintOf(certificate.get()), ::timegm(&end),
            X509_self_signed(certificate.get(), 1) == 1, std::move(names)};
}

}  // namespace lookhaven::remote
