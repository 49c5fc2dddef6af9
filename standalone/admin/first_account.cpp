// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/first_account.h"

#include <charconv>

#include "standalone/admin/users.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"
#include "standalone/store/transaction.h"

namespace lookhaven::admin {

namespace {

constexpr std::size_t kTokenBytes = 24;
// Its value is the token's digest, the boot in which it was given out, and its seconds then; empty once the token was
// used.
constexpr const char* kSetupTokenSetting = "setup_token";

void RequireNoAccount(store::Store& store) {
    if (!store::Users(store).IsEmpty()) {
        throw store::AlreadyExists("there is an account already");
    }
}

}  // namespace

std::string NewSetupToken(store::Store& store, const base::BootTime& now) {
    std::string token = store::RandomHex(kTokenBytes);
    store::InTransaction(store, [&] {
        store::Users(store).Lock();
        RequireNoAccount(store);
        store::Settings(store).Set(kSetupTokenSetting,
                                   store::Digest(token) + ' ' + now.boot + ' ' + std::to_string(now.seconds));
    });
    return token;
}

std::filesystem::path SetupAddressFile(const base::Installation& installation) {
    return installation.RunFolder() / "setup-address";
}

void RequireSetupToken(store::Store& store, std::string_view token, const base::BootTime& now) {
    RequireNoAccount(store);
    const std::string valid = store::Settings(store).Find(kSetupTokenSetting).value_or("");
    const std::string presented = store::Digest(token) + ' ' + now.boot + ' ';
    std::int64_t given_s = now.seconds - kSetupTokenLifetimeS;
    if (valid.starts_with(presented)) {
        std::from_chars(valid.data() + presented.size(), valid.data() + valid.size(), given_s);
    }
    if (now.seconds - given_s >= kSetupTokenLifetimeS) {
        throw InvalidToken("wrong or expired setup token");
    }
}

store::User AddFirstAccount(store::Store& store, std::string_view token, const std::string& name,
                            const store::HashedPassword& password, const std::string& address,
                            const base::BootTime& now) {
    store::User user;
    store::InTransaction(store, [&] {
        store::Users(store).Lock();
        RequireSetupToken(store, token, now);
        const Json::Value record = AddUser(store, {0, "one-time address", address}, name,
                                           {.password = password, .privilege = store::Privilege::kOwner});
        store::Settings(store).Set(kSetupTokenSetting, "");
        user = store::Users(store).Find(record["id"].asInt()).value();
    });
    return user;
}

}  // namespace lookhaven::admin
