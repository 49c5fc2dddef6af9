// SPDX-License-Identifier: Apache-2.0
//
// lookhaven emap: floor plans, and the files that carry them to another host.
#include <fstream>
#include <iostream>
#include <optional>

#include "standalone/admin/emaps.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/json_text.h"
#include "standalone/base/text.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/emap_items.h"
#include "standalone/cli/new_file.h"
#include "standalone/cli/table.h"
#include "standalone/emap/item_json.h"
#include "standalone/emap/pictures.h"

namespace lookhaven::cli {

namespace {

using store::Emap;
using store::EmapItem;
using store::Emaps;

constexpr int kFileVersion = 1;

struct Request {
    int id = 0;
    std::optional<std::string> name;
    std::string file;
    std::optional<bool> hide_names;
    std::optional<bool> small_items;
};

Json::Value ToData(const Emap& emap) {
    return Object("id", emap.id, "name", emap.name, "image", emap.image, "hideItemName", emap.hide_names,
                  "smallItemSize", emap.small_items, "revision", emap.revision);
}

constexpr Column kColumns[] = {{"id", "id"}, {"name", "name"}, {"items", "item_num"}, {"picture", "image"}};

// The contents of a file, or of standard input for "-".
std::string ReadBounded(const std::string& file, std::size_t max_bytes) {
    std::ifstream input;
    if (file != "-") {
        base::OpenFile(file, 0);  // says why it cannot be read
        input.open(file, std::ios::binary);
    }
    std::istream& stream = file == "-" ? std::cin : input;
    std::string bytes(max_bytes + 1, '\0');
    stream.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    bytes.resize(static_cast<std::size_t>(stream.gcount()));
    if (bytes.size() > max_bytes) {
        throw Failure(kDataError, "the file is larger than ", max_bytes >> 20U, " MiB");
    }
    return bytes;
}

// Before the store is opened, since it forks.
emap::MapPicture ReadPicture(const std::string& file) {
    return emap::MapPicture::OfOperator(ReadBounded(file, emap::kMaxUploadBytes));
}

admin::EmapChange ChangeOf(const Request& request) {
    admin::EmapChange change{
        .name = request.name, .hide_names = request.hide_names, .small_items = request.small_items};
    if (!request.file.empty()) {
        change.picture = ReadPicture(request.file);
    }
    return change;
}

void Add(const Console& console, const Request& request) {
    const admin::EmapChange change = ChangeOf(request);
    store::Store store = console.OpenStore();
    const Emap emap = admin::AddEmap(store, {}, console.Installation().Home(), change);
    console.Answer(ToData(emap), "Added e-map ", emap.name, " with id ", emap.id, ".");
}

void Change(const Console& console, const Request& request) {
    const admin::EmapChange change = ChangeOf(request);
    store::Store store = console.OpenStore();
    const Emap emap = admin::SetEmap(store, {}, console.Installation().Home(), request.id, {}, change);
    console.Answer(ToData(emap), "Changed e-map ", emap.id, ".");
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const Json::Value data = Array(Emaps(store).List(), [](const store::EmapSummary& emap) {
        Json::Value entry = ToData(emap);
        entry["item_num"] = emap.item_count;
        return entry;
    });
    console.Answer(data, Table(kColumns, data));
}

void Show(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Emap emap = RequireEmap(store, request.id);
    Json::Value data = ToData(emap);
    data["items"] = emap::ToJson(Emaps(store).Items(emap.id));
    console.Answer(data, emap.name, "\n\n", ItemTable(data["items"]));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::RemoveEmap(store, {}, console.Installation().Home(), request.id, {});
    console.Answer(Object("id", request.id), "Removed e-map ", request.id, ".");
}

void Export(const Console& console, const Request& request) {
    Emap emap;
    WriteNewFile(request.file, [&](int output) {
        store::Store store = console.OpenStore();
        emap = RequireEmap(store, request.id);
        const std::string picture = emap::Pictures(store, console.Installation().Home()).Read(emap.image);
        const Json::Value file = Object("lookhaven_emap", kFileVersion, "name", emap.name, "hideItemName",
                                        emap.hide_names, "smallItemSize", emap.small_items, "items",
                                        emap::ToJson(Emaps(store).Items(emap.id)), "picture", base::ToBase64(picture));
        const std::string text = base::IndentedJson(file) + "\n";
        if (!base::WriteAll(output, text.data(), text.size())) {
            base::ThrowErrno("cannot write " + request.file);
        }
    });
    console.Answer(Object("id", emap.id, "file", request.file), "Wrote e-map ", emap.name, " to ", request.file, ".");
}

Json::Value ReadEmapFile(const std::string& path) {
    const Json::Value file = ParseJson(ReadBounded(path, 2 * emap::kMaxPictureBytes));
    if (!file.isObject() || file["lookhaven_emap"] != kFileVersion || !file["name"].isString() ||
        !file["picture"].isString() || !file["hideItemName"].isBool() || !file["smallItemSize"].isBool()) {
        throw Failure(kDataError, path, " is not an e-map that lookhaven emap export wrote");
    }
    return file;
}

void Import(const Console& console, const Request& request) {
    const Json::Value file = ReadEmapFile(request.file);
    const std::optional<std::string> picture = base::FromBase64(file["picture"].asString());
    if (!picture) {
        throw Failure(kDataError, "the picture in ", request.file, " is damaged");
    }
    const admin::EmapChange change{.name = request.name.value_or(file["name"].asString()),
                                   .hide_names = file["hideItemName"].asBool(),
                                   .small_items = file["smallItemSize"].asBool(),
                                   .picture = emap::MapPicture::OfOperator(*picture)};
    std::vector<EmapItem> items = emap::ItemsFromJson(file["items"]);
    store::Store store = console.OpenStore();
    const std::size_t all = items.size();
    std::erase_if(items, [&](const EmapItem& item) { return !Emaps(store).Knows(item); });
    const std::filesystem::path home = console.Installation().Home();
    Emap emap = admin::AddEmap(store, {}, home, change);
    try {
        emap.revision = admin::PlaceItems(store, {}, emap, items);
    } catch (...) {
        admin::RemoveEmap(store, {}, home, emap.id, {});
        throw;
    }
    const std::size_t left_out = all - items.size();
    Json::Value data = ToData(emap);
    data["items_left_out"] = Json::UInt64(left_out);
    console.Answer(data, "Added e-map ", emap.name, " with id ", emap.id, "; ", left_out,
                   " items were left out, since their devices do not exist here.");
}

}  // namespace

void AddEmap(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "emap", "E-maps: floor plans with devices on them");
    Request& request = group.request();
    const std::string id = "The e-map's id";
    const std::string name = "The e-map's name";
    const auto add_flags = [&](Command& command) {
        command.Switch("--hide-names,!--show-names", request.hide_names, "Whether names are shown beside the items")
            .Switch("--small-items,!--large-items", request.small_items, "The size in which items are drawn");
    };
    Command add = group.Add("add", "Adds an e-map with its picture: PNG, JPEG, WebP or SVG, at most 20 MiB", Add)
                      .Option("name", request.name, name, Required)
                      .Option("picture", request.file, "The picture's file; - for standard input", Required);
    add_flags(add);
    Command set = group.Add("set", "Changes the given properties of an e-map", Change)
                      .Option("id", request.id, id, Required)
                      .Option("--name", request.name, name)
                      .Option("--picture", request.file, "The new picture's file");
    add_flags(set);
    group.Add("list", "Lists the e-maps", List);
    group.Add("show", "Lists the items on an e-map", Show).Option("id", request.id, id, Required);
    group.Add("remove", "Removes an e-map and its picture; devices are kept", Remove)
        .Option("id", request.id, id, Required);
    group.Add("export", "Writes an e-map with its picture and items to a file", Export)
        .Option("id", request.id, id, Required)
        .Option("file", request.file, "The file to write", Required);
    group.Add("import", "Adds an e-map from an exported file; items of unknown devices are left out", Import)
        .Option("file", request.file, "The file to read", Required)
        .Option("--name", request.name, "Another name than that in the file");
    AddEmapItem(group.app(), console);
}

}  // namespace lookhaven::cli
