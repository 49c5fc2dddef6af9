// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/change.h"

#include <charconv>

#include "standalone/base/clock.h"
#include "standalone/base/json_text.h"
#include "standalone/store/audit_log.h"
#include "standalone/store/secret.h"
#include "standalone/store/transaction.h"
#include "standalone/store/users.h"

namespace lookhaven::admin {

namespace {

constexpr std::size_t kMaxRecordBytes = 16'384;
constexpr std::size_t kRevisionDigits = 12;

std::string AuditText(const Json::Value& record) {
    if (record.isNull()) {
        return "";
    }
    std::string text = base::OneLineJson(record);
    return text.size() <= kMaxRecordBytes ? text : R"({"tooLarge":)" + std::to_string(text.size()) + "}";
}

Json::Value WithoutRevision(Json::Value record) {
    if (record.isObject()) {
        record.removeMember("revision");
    }
    return record;
}

// Inside of a transaction.
void MakeAndAudit(store::Store& store, const Actor& actor, const std::function<Change()>& make) {
    const Change change = make();
    const Json::Value before = WithoutRevision(change.before);
    const Json::Value after = WithoutRevision(change.after);
    if (before != after) {
        store::AuditLog(store).Add({0, base::WallSeconds(), actor.user_id, actor.name, actor.address, change.action,
                                    change.object, AuditText(before), AuditText(after)});
    }
}

}  // namespace

void Apply(store::Store& store, const Actor& actor, const std::function<Change()>& make) {
    store::InTransaction(store, [&] {
        store::Users(store).Lock();  // who may make this change may do so until it is made
        RequireManager(store, actor);
        MakeAndAudit(store, actor, make);
    });
}

void ApplyToSelf(store::Store& store, const Actor& actor, const std::function<Change()>& make) {
    store::InTransaction(store, [&] {
        store::Users(store).Lock();
        MakeAndAudit(store, actor, make);
    });
}

std::string Named(const std::string& name, int id) {
    return name + " (" + std::to_string(id) + ")";
}

std::int64_t RevisionOf(const Json::Value& record) {
    const std::string digits = store::Digest(base::OneLineJson(WithoutRevision(record))).substr(0, kRevisionDigits);
    std::int64_t revision = 0;
    std::from_chars(digits.data(), digits.data() + digits.size(), revision, 16);
    return revision;
}

void RequireCurrent(const Json::Value& record, std::optional<std::int64_t> seen) {
    if (seen && *seen != record["revision"].asInt64()) {
        throw Stale(record);
    }
}

}  // namespace lookhaven::admin
