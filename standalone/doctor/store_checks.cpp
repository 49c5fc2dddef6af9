// SPDX-License-Identifier: Apache-2.0
//
// The record store: whether it can be read, belongs to this program, and makes sense.
#include <algorithm>
#include <filesystem>

#include "standalone/doctor/checks.h"
#include "standalone/store/users.h"

namespace lookhaven::doctor {

namespace {

constexpr const char* kRestore =
    "stop the server, replace the store with a backup, start the server and run lookhaven verify --repair, "
    "which imports what was recorded since";

// What SQLite says of a file that it cannot understand.
bool IsMalformed(const std::string& message) {
    return message.find("malformed") != std::string::npos || message.find("not a database") != std::string::npos;
}

Finding FindingOf(const std::string& sentence) {
    const std::size_t colon = sentence.find(": ");
    return {sentence.substr(0, colon), colon == std::string::npos ? kRestore : sentence.substr(colon + 2)};
}

}  // namespace

Findings CheckStore(const base::Installation& installation) {
    const std::filesystem::path file = installation.Home() / "lookhaven.db";
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        Findings findings;
        for (const std::string& sentence : store.Check()) {
            findings.push_back(IsMalformed(sentence) ? Finding{sentence, kRestore} : FindingOf(sentence));
        }
        const std::vector<store::User> users = store::Users(store).List();
        if (users.empty()) {
            findings.push_back({"there is no account yet", "lookhaven setup-address"});
        } else if (std::ranges::none_of(users, [](const store::User& user) { return user.IsManager(); })) {
            findings.push_back({"no account may manage this installation", "lookhaven init --admin NAME"});
        }
        return findings;
    } catch (const store::SchemaError& error) {
        const std::string sentence = error.what();
        const bool is_newer = sentence.find("newer") != std::string::npos;
        return {{sentence, is_newer ? "update Lookhaven on this host" : "lookhaven init"}};
    } catch (const store::StoreError& error) {
        const bool is_malformed = IsMalformed(error.what());
        const bool is_own_file = installation.StoreUrl() == "sqlite:" + file.string();
        if (is_own_file && !is_malformed && !IsStateWritable(installation)) {
            return {};  // CheckFolder reports it
        }
        return {{error.what(),
                 is_malformed ? kRestore
                 : is_own_file
                     ? "check that the file lookhaven.db is there and that you have access"
                     : "check the address in the file \"store\" in the state folder, and whether what it names can be "
                       "reached"}};
    } catch (const std::exception& error) {
        if (!IsStateWritable(installation)) {
            return {};  // CheckFolder reports it
        }
        return {{error.what(), "check the file \"store\" in the state folder"}};
    }
}

}  // namespace lookhaven::doctor
