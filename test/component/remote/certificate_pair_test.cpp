// SPDX-License-Identifier: Apache-2.0
//
// Certificates with their keys: which pairs a web server may use, and which of other hosts are trusted.
#include "standalone/remote/certificate_pair.h"

#include <gmock/gmock.h>

#include "standalone/base/clock.h"
#include "test/component/remote/certificate_files.h"

namespace lookhaven::remote {
namespace {

using testing::HasSubstr;

constexpr std::int64_t kDay = 86'400;

TEST(CertificatePair, IsTakenWhereBrowsersWillTakeIt) {
    const struct {
        const char* chain;
        const char* key;
        const char* refusal = nullptr;  // null: it is taken
        std::int64_t later_s = 60;
    } rows[] = {
        {"ec.pem", "ec.key"},
        {"other.pem", "other.key"},
        {"rsa.pem", "rsa.key"},
        {"chain.pem", "leaf.key"},
        {"leaf.pem", "leaf.key"},
        {"both.pem", "both.pem"},
        {"reversed.pem", "ca.key", "certificate 2 of the file is not the issuer"},
        {"stranger.pem", "leaf.key", "certificate 2 of the file is not the issuer"},
        {"damaged.pem", "leaf.key", "certificate 2 of the file is damaged"},
        {"rsa.key", "rsa.key", "there is no certificate"},
        {"rsa.pem", "rsa.pem", "there is no private key"},
        {"rsa.pem", "locked.key", "encrypted with a password"},
        {"rsa.pem", "leaf.key", "that of another certificate"},
        {"ec.pem", "half.key", "its private half is of another key"},
        {"short.pem", "short.key", "of a kind that not all browsers know"},
        {"ed.pem", "ed.key", "of a kind that not all browsers know"},
        {"p521.pem", "p521.key", "of a kind that not all browsers know"},
        {"client.pem", "client.key", "something else than a web server"},
        {"spaced.pem", "spaced.key", "names no valid host"},
        {"rsa.pem", "rsa.key", "has expired", 91 * kDay},
        {"rsa.pem", "rsa.key", "is not valid yet", -kDay},
        {"chain.pem", "leaf.key", "the certificate has expired", 61 * kDay},
    };
    for (const auto& row : rows) {
        std::string refusal;
        try {
            const CertificatePair pair =
                ReadCertificatePair(File(row.chain), File(row.key), base::WallSeconds() + row.later_s);
            EXPECT_EQ(pair.certificates.find("PRIVATE"), std::string::npos);
            EXPECT_EQ(pair.key.find("CERTIFICATE"), std::string::npos);
            const CertificatePair again =
                ReadCertificatePair(pair.certificates, pair.key, base::WallSeconds() + row.later_s);
            EXPECT_EQ(again.facts.fingerprint, pair.facts.fingerprint);
        } catch (const InvalidCertificate& error) {
            refusal = error.what();
        }
        EXPECT_EQ(refusal.empty(), row.refusal == nullptr) << row.chain << ' ' << row.key << ": " << refusal;
        EXPECT_THAT(refusal, HasSubstr(row.refusal == nullptr ? "" : row.refusal)) << row.chain << ' ' << row.key;
    }
    const std::string large(kMaxKeyBytes + 1, ' ');
    EXPECT_THROW(ReadCertificatePair(File("rsa.pem"), File("rsa.key") + large, base::WallSeconds() + 60),
                 InvalidCertificate);
}

TEST(CertificatePair, IsTrustedByWhoKnowsItOrItsIssuer) {
    const struct {
        const char* known;
        const char* shown;
        bool is_trusted;
    } rows[] = {{"ec.pem", "ec.pem", true},         {"leaf.pem", "chain.pem", true}, {"chain.pem", "renewed.pem", true},
                {"leaf.pem", "renewed.pem", false}, {"ec.pem", "rsa.pem", false},    {"ca.key", "ec.pem", false},
                {"chain.pem", "ca.pem", false}};
    for (const auto& row : rows) {
        EXPECT_EQ(IsTrustedThrough(File(row.known), File(row.shown)), row.is_trusted) << row.known << ' ' << row.shown;
    }
}

}  // namespace
}  // namespace lookhaven::remote
