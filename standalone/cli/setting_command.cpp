// SPDX-License-Identifier: Apache-2.0
//
// lookhaven setting: settings of the whole installation.
#include <string>

#include "standalone/admin/settings.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/configuration_file.h"
#include "standalone/cli/table.h"
#include "standalone/store/settings.h"

namespace lookhaven::cli {

namespace {

constexpr Column kColumns[] = {{"setting", "setting"}, {"value", "value"}, {"meaning", "meaning"}};

struct Request {
    int value = 0;
    std::string word;
};

struct CheckRequest {
    std::string file = kConfigurationFile;
};

// "on", "off", a number or folders; of a token, whether there is one.
std::string TextOf(const Json::Value& value) {
    return value.isBool() ? value.asBool() ? "on" : "off" : value.asString();
}

void Show(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::objectValue;
    Json::Value rows = Json::arrayValue;
    for (const admin::Setting& setting : admin::Settings()) {
        data[setting.name] = TextOf(admin::SettingRecord(store, setting)["value"]);
        rows.append(Object("setting", setting.name, "value", data[setting.name], "meaning", setting.meaning));
    }
    console.Answer(data, Table(kColumns, rows));
}

void Set(const Console& console, const std::string& name, const Json::Value& value) {
    {
        store::Store store = console.OpenStore();
        admin::SetSetting(store, {}, name, {}, value);
    }
    Show(console);
}

void SetCms(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const bool on = request.word == "on";
    admin::SetSetting(store, {}, "cms", {}, on);
    console.Answer(Object("cms", on), "This host ", on ? "shows" : "does not show", " the cameras of paired hosts.");
}

void SetMountFolders(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::SetSetting(store, {}, store::kMountFoldersSetting, {}, request.word);
    console.Answer(Object("mount_folders", request.word), "Accounts may add mounts below ", request.word, ".");
}

void SetMonitorToken(const Console& console, const Request& request) {
    const bool is_new = request.word == "new";
    store::Store store = console.OpenStore();
    const std::string token = admin::SetMonitorToken(store, {}, is_new);
    console.Answer(Object("token", token), is_new ? token : "Monitors on other machines are refused.");
}

void Check(const Console& console, const CheckRequest& request) {
    CheckConfigurationFile(request.file);
    console.Answer(Object("file", request.file), "All keys in ", request.file, " are valid.");
}

}  // namespace

void AddSetting(CLI::App& program, const Console& console) {
    CommandGroup<> group(program, console, "setting", "Settings of the whole installation");
    group.Add("show", "Shows all settings", Show);
    CommandGroup<CheckRequest> check(group.app(), console);
    check.Add("check", "Checks the configuration file of the installed services", Check)
        .Option("file", check.request().file, std::string("The file (default: ") + kConfigurationFile + ")");
    CommandGroup<Request> set(group.app(), console, "set", "Changes a setting");
    for (const admin::Setting& setting : admin::Settings()) {
        if (setting.kind == admin::Setting::Kind::kNumber) {
            set.Add(setting.name, setting.meaning,
                    [name = setting.name](const Console& shown_on, const Request& given) {
                        Set(shown_on, name, given.value);
                    })
                .Option("value", set.request().value, "", Required, Satisfies(CLI::Range(setting.min, setting.max)));
        }
    }
    set.Add("cms", "Central management: whether cameras of paired hosts are shown here", SetCms)
        .Option("value", set.request().word, "on or off", Required, Satisfies(CLI::IsMember({"on", "off"})));
    set.Add(store::kMountFoldersSetting,
            "Folders below which managers may add mounts in the browser, such as /mnt:/media", SetMountFolders)
        .Option("value", set.request().word, "The folders, with : between them", Required);
    set.Add(store::kMonitorTokenSetting, "Token that lets a monitor on another machine read /healthz and /metrics",
            SetMonitorToken)
        .Option("value", set.request().word, "new: replaces it and prints it, once; off: removes it", Required,
                Satisfies(CLI::IsMember({"new", "off"})));
}

}  // namespace lookhaven::cli
