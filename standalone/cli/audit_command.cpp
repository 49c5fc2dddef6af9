// SPDX-License-Identifier: Apache-2.0
//
// lookhaven audit: what was changed, by whom and from where.
#include "standalone/base/json_text.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/store/audit_log.h"

namespace lookhaven::cli {

namespace {

struct Request {
    int limit = 50;
    int before = 0;
};

std::string TimeText(const Json::Value& entry) {
    return FormatMoment(entry["time"].asInt64());
}

std::string WhoText(const Json::Value& entry) {
    const std::string address = entry["address"].asString();
    return entry["who"].asString() + (address.empty() ? "" : " at " + address);
}

// The members that differ: "name: Gate -> Yard".
std::string ChangesText(const Json::Value& entry) {
    const Json::Value& before = entry["before"];
    const Json::Value& after = entry["after"];
    if (!before.isObject() || !after.isObject()) {
        return "";
    }
    std::string text;
    for (const std::string& name : after.getMemberNames()) {
        if (before[name] != after[name]) {
            text += (text.empty() ? "" : "; ") + name + ": " +
                    (before.isMember(name) ? base::OneLineJson(before[name]) + " -> " : "") +
                    base::OneLineJson(after[name]);
        }
    }
    return text;
}

constexpr Column kColumns[] = {{"id", "id"},         {"time", "", TimeText}, {"who", "", WhoText},
                               {"action", "action"}, {"object", "object"},   {"changes", "", ChangesText}};

void Show(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    for (const store::AuditEntry& entry : store::AuditLog(store).List(request.before, request.limit)) {
        data.append(Object("id", entry.id, "time", entry.time_s, "who", entry.who, "address", entry.address, "action",
                           entry.action, "object", entry.object, "before", ParseJson(entry.before), "after",
                           ParseJson(entry.after)));
    }
    console.Answer(data, Table(kColumns, data));
}

}  // namespace

void AddAudit(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("audit", "Shows what was changed, by whom and from where, newest first", Show)
        .Option("--limit", group.request().limit, "At most that many changes (default: 50)",
                Satisfies(CLI::Range(1, 100'000)))
        .Option("--before", group.request().before, "Those before the change of that id");
}

}  // namespace lookhaven::cli
