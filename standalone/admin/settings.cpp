// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/settings.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "standalone/admin/change.h"
#include "standalone/store/marks.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"

namespace lookhaven::admin {

namespace {

using Kind = Setting::Kind;

// Clients go there with what they log in with, so it takes more than a manager's session to change it.
constexpr std::string_view kLoginPort = "login_port";

constexpr std::array kSettings = {
    Setting{kLoginPort.data(), Kind::kNumber, 8080, 1, 65535, "the port that clients are given for a direct log-in"},
    Setting{"players_per_session", Kind::kNumber, 9, 1, 16, "recorded events that one session may play side by side"},
    Setting{"marks_per_day", Kind::kNumber, store::kMarksPerDay, 1, 1'000'000,
            "alerts and POS transactions that one account may report within 24 hours"},
    Setting{kCentralManagement, Kind::kSwitch, 0, 0, 1, "central management: cameras of paired hosts are shown here"},
    Setting{store::kMountFoldersSetting, Kind::kFolders, 0, 0, 0,
            "folders below which managers may add mounts in the browser"},
    Setting{store::kMonitorTokenSetting, Kind::kToken, 0, 0, 0,
            "a token lets monitors on other machines read /healthz and /metrics"}};

constexpr std::size_t kShownDigits = 8;  // of a token's digest, which tells nothing of the token

const char* NameOf(Kind kind) {
    switch (kind) {
    case Kind::kNumber:
        return "number";
    case Kind::kSwitch:
        return "switch";
    case Kind::kFolders:
        return "folders";
    case Kind::kToken:
        return "token";
    }
    return "";
}

bool IsOperators(const Setting& setting) {
    return setting.kind == Kind::kFolders || setting.kind == Kind::kToken || setting.name == kLoginPort;
}

Json::Value ValueOf(store::Store& store, const Setting& setting) {
    store::Settings settings(store);
    switch (setting.kind) {
    case Kind::kNumber:
        return std::clamp(settings.NumberOr(setting.name, setting.initial), setting.min, setting.max);
    case Kind::kSwitch:
        return settings.Find(setting.name) == "on";
    case Kind::kFolders:
        return settings.Find(setting.name).value_or(store::kMountFolders);
    case Kind::kToken:
        return !settings.Find(setting.name).value_or("").empty();
    }
    return {};
}

Json::Value InitialOf(const Setting& setting) {
    switch (setting.kind) {
    case Kind::kNumber:
        return setting.initial;
    case Kind::kFolders:
        return store::kMountFolders;
    default:
        return false;
    }
}

[[noreturn]] void Refuse(const Setting& setting, const std::string& form) {
    throw store::InvalidRecord(std::string(setting.name) + " must be " + form);
}

void RequireFolders(const Setting& setting, const std::string& folders) {
    for (std::size_t at = 0; at <= folders.size();) {
        const std::size_t end = std::min(folders.find(':', at), folders.size());
        if (const std::string folder = folders.substr(at, end - at);
            folder.size() < 2 || folder.front() != '/' || folder.back() == '/') {
            Refuse(setting, "folders of which each begins with / and ends without, with : between them: /mnt:/media");
        }
        at = end + 1;
    }
}

// As the store keeps it.
std::string StoredText(const Setting& setting, const Json::Value& value) {
    switch (setting.kind) {
    case Kind::kNumber:
        if (!value.isInt() || value.asInt() < setting.min || value.asInt() > setting.max) {
            Refuse(setting, "a number from " + std::to_string(setting.min) + " to " + std::to_string(setting.max));
        }
        return std::to_string(value.asInt());
    case Kind::kSwitch:
        if (!value.isBool()) {
            Refuse(setting, "true or false");
        }
        return value.asBool() ? "on" : "off";
    case Kind::kFolders:
        RequireFolders(setting, value.isString() ? value.asString() : "");
        return value.asString();
    case Kind::kToken:
        break;
    }
    Refuse(setting, "can only be replaced: lookhaven setting set monitor_token new");
}

const Setting& RequireSetting(const std::string& name) {
    const auto* const found = std::ranges::find_if(kSettings, [&](const Setting& each) { return name == each.name; });
    if (found == kSettings.end()) {
        throw store::NotFound("there is no setting " + name);
    }
    return *found;
}

void RequireOperator(const Actor& actor, const Setting& setting) {
    if (IsOperators(setting) && actor.user_id != 0) {
        throw Forbidden("this is the operator's to change, on the server itself, with lookhaven setting set");
    }
}

Json::Value Audited(const Json::Value& value) {
    Json::Value record;
    record["value"] = value;
    return record;
}

std::string ShownDigest(const std::string& digest) {
    return digest.empty() ? "none" : "digest " + digest.substr(0, kShownDigits);
}

}  // namespace

std::span<const Setting> Settings() {
    return kSettings;
}

Json::Value SettingRecord(store::Store& store, const Setting& setting) {
    const bool has_bounds = setting.kind == Kind::kNumber;
    Json::Value seen;
    seen["name"] = setting.name;
    seen["value"] = ValueOf(store, setting);
    Json::Value json = seen;
    json["kind"] = NameOf(setting.kind);
    json["initial"] = InitialOf(setting);
    json["min"] = has_bounds ? Json::Value(setting.min) : Json::Value();
    json["max"] = has_bounds ? Json::Value(setting.max) : Json::Value();
    json["meaning"] = setting.meaning;
    json["operator"] = IsOperators(setting);
    json["revision"] = Json::Int64{RevisionOf(seen)};
    return json;
}

Json::Value SetSetting(store::Store& store, const Actor& actor, const std::string& name,
                       std::optional<std::int64_t> seen, const Json::Value& value) {
    const Setting& setting = RequireSetting(name);
    RequireOperator(actor, setting);
    const std::string text = StoredText(setting, value);
    Json::Value record;
    Apply(store, actor, [&] {
        const Json::Value before = SettingRecord(store, setting);
        RequireCurrent(before, seen);
        store::Settings(store).Set(setting.name, text);
        record = SettingRecord(store, setting);
        return Change{"setting.set", setting.name, Audited(before["value"]), Audited(record["value"])};
    });
    return record;
}

std::string SetMonitorToken(store::Store& store, const Actor& actor, bool is_new) {
    const Setting& setting = RequireSetting(store::kMonitorTokenSetting);
    RequireOperator(actor, setting);
    const std::string token = is_new ? store::RandomHex(store::kMonitorTokenDigits / 2) : "";
    Apply(store, actor, [&] {
        const std::string before = store::Settings(store).Find(setting.name).value_or("");
        const std::string after = is_new ? store::Digest(token) : "";
        store::Settings(store).Set(setting.name, after);
        return Change{"setting.set", setting.name, Audited(ShownDigest(before)), Audited(ShownDigest(after))};
    });
    return token;
}

}  // namespace lookhaven::admin
