// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/export_checks.h"

#include <algorithm>
#include <memory>
#include <string>

#include "standalone/base/names.h"
#include "standalone/base/sha256.h"
#include "standalone/base/text.h"
#include "standalone/cli/export_verification.h"
#include "standalone/evidence/signing_key.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::string file;
    std::string key;  // the fingerprint that the signature must have
};

enum class Signer { kNobody, kUnknown, kOther, kNamed, kOwn };

const char* NameOf(Signer signer) {
    switch (signer) {
    case Signer::kNobody:
        return "nobody";
    case Signer::kUnknown:
        return "unknown";
    case Signer::kOther:
        return "other";
    case Signer::kNamed:
        return "named";
    case Signer::kOwn:
        return "own";
    }
    return "";
}

std::string SentenceOf(Signer signer, const std::string& fingerprint) {
    switch (signer) {
    case Signer::kNobody:
        return "It is not signed: anybody who changed a file could have changed its hash as well.";
    case Signer::kUnknown:
        return "Signed by a key that this host does not know, " + fingerprint +
               ": anybody can make one. Compare it with what lookhaven export key shows on the host that the export is"
               " said to be of, and name that by --key.";
    case Signer::kOther:
        return "Signed by another key than the one you named: " + fingerprint + ".";
    case Signer::kNamed:
        return "Signed by the key that you named.";
    case Signer::kOwn:
        return "Signed by this host, whose key is " + fingerprint + ".";
    }
    return "";
}

constexpr const char* kNotProved =
    "Not proved: that the host and its clock were right and untouched before the export, that its recordings are what"
    " the cameras saw, and who used the account that the manifest names.";

// The fingerprint of this host's key; empty where there is none that may be read: verifying needs no installation.
std::string OwnFingerprint(const Console& console) try {
    const evidence::SignatureLibrary& library = evidence::LoadSignatureLibrary();
    return library.FingerprintOf(library.PublicKeyOf(base::Installation(console.HomePath()).SigningKeyFile()));
} catch (const std::exception&) {
    return "";
}

// As a person may write it: in capitals, with colons or spaces.
std::string PlainFingerprint(std::string text) {
    std::erase_if(text, [](char c) { return c == ':' || c == ' '; });
    std::ranges::transform(text, text.begin(),
                           [](char c) { return c >= 'A' && c <= 'F' ? static_cast<char>(c - 'A' + 'a') : c; });
    if (!base::IsHex(text, base::kSha256Digits)) {
        throw Failure(kUsage, "--key takes the 64 hexadecimal digits that lookhaven export key shows on a host");
    }
    return text;
}

Signer SignerOf(const Console& console, const std::string& fingerprint, const std::string& wanted) {
    if (fingerprint.empty()) {
        return Signer::kNobody;
    }
    if (!wanted.empty()) {
        return fingerprint == wanted ? Signer::kNamed : Signer::kOther;
    }
    return fingerprint == OwnFingerprint(console) ? Signer::kOwn : Signer::kUnknown;
}

void Verify(const Console& console, const Request& request) {
    const std::string wanted = request.key.empty() ? "" : PlainFingerprint(request.key);
    const ExportVerification verification = VerifyExport(request.file);
    const Signer signer = SignerOf(console, verification.fingerprint, wanted);
    std::string text;
    for (const std::string& fault : verification.faults) {
        text += fault + '\n';
    }
    text += Concat(verification.files, verification.files == 1 ? " file is" : " files are", " unchanged.\n");
    if (verification.faults.empty()) {
        text += SentenceOf(signer, verification.fingerprint) + '\n' + kNotProved;
    }
    console.Answer(Object("files", verification.files, "signer", NameOf(signer), "fingerprint",
                          verification.fingerprint, "faults",
                          Array(verification.faults, [](const std::string& fault) { return Json::Value(fault); })),
                   text);
    if (!verification.faults.empty()) {
        throw Failure(kFindings, "this export was changed after it was made");
    }
    if (signer == Signer::kOther || (signer == Signer::kNobody && !wanted.empty())) {
        throw Failure(kFindings, "this export is not signed by the key that you named");
    }
    if (signer == Signer::kNobody || signer == Signer::kUnknown) {
        throw Failure(kUnproven, "this export is not signed by a known key");
    }
}

void ShowKey(const Console& console) {
    const std::filesystem::path key = console.Installation().SigningKeyFile();
    evidence::RequireSigningKey(key);
    const evidence::SignatureLibrary& library = evidence::LoadSignatureLibrary();
    const std::string public_key = library.PublicKeyOf(key);
    const std::string fingerprint = library.FingerprintOf(public_key);
    console.Answer(Object("fingerprint", fingerprint, "public_key", public_key), fingerprint, '\n', public_key);
}

}  // namespace

void AddExportChecks(CLI::App& command, const Console& console) {
    auto request = std::make_shared<Request>();
    CLI::App* verify =
        command.add_subcommand("verify", "Checks that an exported .zip file is as it was made, and by whom");
    verify->add_option("file", request->file, "The file")->required();
    verify->add_option("--key", request->key,
                       "The fingerprint of the key that must have signed it (default: this host's)");
    verify->callback([&console, request] { Verify(console, *request); });
    command.add_subcommand("key", "Shows the key that this host signs exports with: note its fingerprint elsewhere")
        ->callback([&console] { ShowKey(console); });
}

}  // namespace lookhaven::cli
