// SPDX-License-Identifier: Apache-2.0
//
// lookhaven setting: what holds for the whole installation.
#include <algorithm>
#include <string>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/settings_file.h"
#include "standalone/cli/table.h"
#include "standalone/store/marks.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"

namespace lookhaven::cli {

namespace {

struct Setting {
    const char* name;
    int initial;
    int min;
    int max;
    const char* meaning;
};

constexpr Setting kSettings[] = {
    {"login_port", 8080, 1, 65535, "the port that clients are given for a direct log-in"},
    {"players_per_session", 9, 1, 16, "recorded events that one session may play side by side"},
    {"marks_per_day", store::kMarksPerDay, 1, 1'000'000,
     "alerts and POS transactions that one account may report within 24 hours"}};

constexpr Column kColumns[] = {{"setting", "setting"}, {"value", "value"}, {"meaning", "meaning"}};

struct Request {
    int value = 0;
    std::string word;
};

struct CheckRequest {
    std::string file = kSettingsFile;
};

void Show(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::objectValue;
    Json::Value rows = Json::arrayValue;
    for (const Setting& setting : kSettings) {
        data[setting.name] = store::Settings(store).Find(setting.name).value_or(std::to_string(setting.initial));
        rows.append(Object("setting", setting.name, "value", data[setting.name], "meaning", setting.meaning));
    }
    console.Answer(data, Table(kColumns, rows));
}

void Set(const Console& console, const Setting& setting, int value) {
    {
        store::Store store = console.OpenStore();
        store::Settings(store).Set(setting.name, std::to_string(value));
    }
    Show(console);
}

void SetCms(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    store::Settings(store).Set("cms", request.word);
    const bool on = request.word == "on";
    console.Answer(Object("cms", on), "This host ", on ? "manages" : "does not manage", " its recording servers.");
}

void SetMountFolders(const Console& console, const Request& request) {
    for (std::size_t at = 0; at <= request.word.size();) {
        const std::size_t end = std::min(request.word.find(':', at), request.word.size());
        if (const std::string folder = request.word.substr(at, end - at);
            folder.size() < 2 || folder.front() != '/' || folder.back() == '/') {
            throw Failure(kDataError, "each folder begins with / and ends without: /mnt:/media");
        }
        at = end + 1;
    }
    store::Store store = console.OpenStore();
    store::Settings(store).Set(store::kMountFoldersSetting, request.word);
    console.Answer(Object("mount_folders", request.word), "Accounts may add mounts below ", request.word, ".");
}

void SetMonitorToken(const Console& console, const Request& request) {
    const bool is_new = request.word == "new";
    const std::string token = is_new ? store::RandomHex(store::kMonitorTokenDigits / 2) : "";
    store::Store store = console.OpenStore();
    store::Settings(store).Set(store::kMonitorTokenSetting, is_new ? store::Digest(token) : "");
    console.Answer(Object("token", token), is_new ? token : "Monitors on other machines are refused.");
}

void Check(const Console& console, const CheckRequest& request) {
    CheckSettingsFile(request.file);
    console.Answer(Object("file", request.file), "The settings in ", request.file, " are valid.");
}

}  // namespace

void AddSetting(CLI::App& program, const Console& console) {
    CommandGroup<> group(program, console, "setting", "What holds for the whole installation");
    group.Add("show", "Shows all settings", Show);
    CommandGroup<CheckRequest> check(group.app(), console);
    check.Add("check", "Checks the settings of the installed services", Check)
        .Option("file", check.request().file, std::string("The file (default: ") + kSettingsFile + ")");
    CommandGroup<Request> set(group.app(), console, "set", "Changes a setting");
    for (const Setting& setting : kSettings) {
        set.Add(setting.name, setting.meaning,
                [&setting](const Console& shown_on, const Request& given) { Set(shown_on, setting, given.value); })
            .Option("value", set.request().value, "", Required, Satisfies(CLI::Range(setting.min, setting.max)));
    }
    set.Add("cms", "Central management: whether this host manages its recording servers", SetCms)
        .Option("value", set.request().word, "on or off", Required, Satisfies(CLI::IsMember({"on", "off"})));
    set.Add("mount-folders", "Folders below which managers may add mounts in the browser, such as /mnt:/media",
            SetMountFolders)
        .Option("value", set.request().word, "The folders, with : between them", Required);
    set.Add("monitor-token", "Token that lets a monitor on another machine read /healthz and /metrics", SetMonitorToken)
        .Option("value", set.request().word, "new: replaces it and prints it, once; off: removes it", Required,
                Satisfies(CLI::IsMember({"new", "off"})));
}

}  // namespace lookhaven::cli
