// SPDX-License-Identifier: Apache-2.0
//
// lookhaven emap: floor plans, what is placed on them, and maps as single files.
#include <fstream>
#include <iterator>
#include <memory>
#include <optional>

#include "standalone/base/file.h"
#include "standalone/base/text.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/emap_items.h"
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
    Json::Value data;
    data["id"] = emap.id;
    data["name"] = emap.name;
    data["image"] = emap.image;
    data["hideItemName"] = emap.hide_names;
    data["smallItemSize"] = emap.small_items;
    data["revision"] = emap.revision;
    return data;
}

// A file of up to the limit; standard input for "-".
std::string ReadBounded(const std::string& file, std::size_t limit) {
    std::ifstream input;
    if (file != "-") {
        base::OpenFile(file, 0);  // says why it cannot be read
        input.open(file, std::ios::binary);
    }
    std::istream& stream = file == "-" ? std::cin : input;
    std::string bytes(limit + 1, '\0');
    stream.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    bytes.resize(static_cast<std::size_t>(stream.gcount()));
    if (bytes.size() > limit) {
        throw Failure(kDataError, "the file is larger than " + std::to_string(limit >> 20U) + " MiB");
    }
    return bytes;
}

// The map goes again when it cannot have its picture and items.
template <typename Fill>
Emap AddFilled(store::Store& store, const Emap& emap, Fill&& fill) {
    const int id = Emaps(store).Add(emap);
    try {
        fill(id);
    } catch (...) {
        Emaps(store).Remove(id);
        throw;
    }
    return *Emaps(store).Find(id);
}

void Add(const Console& console, const Request& request) {
    const std::string picture = ReadBounded(request.file, emap::kMaxPictureBytes);
    store::Store store = console.OpenStore();
    Emap wanted{.name = request.name.value_or("")};
    wanted.hide_names = request.hide_names.value_or(false);
    wanted.small_items = request.small_items.value_or(false);
    const Emap emap = AddFilled(store, wanted,
                                [&](int id) { emap::Pictures(store, console.Installation().Home()).Put(id, picture); });
    console.Answer("The e-map " + emap.name + " has the id " + std::to_string(emap.id) + ".", ToData(emap));
}

void Change(const Console& console, const Request& request) {
    const std::optional<std::string> picture =
        request.file.empty() ? std::nullopt : std::optional(ReadBounded(request.file, emap::kMaxPictureBytes));
    store::Store store = console.OpenStore();
    Emap emap = RequireEmap(store, request.id);
    emap.name = request.name.value_or(emap.name);
    emap.hide_names = request.hide_names.value_or(emap.hide_names);
    emap.small_items = request.small_items.value_or(emap.small_items);
    if (picture) {
        emap::Pictures(store, console.Installation().Home()).Put(emap.id, *picture);
    }
    Emaps(store).Update(emap);
    console.Answer("The e-map " + std::to_string(emap.id) + " is changed.", ToData(RequireEmap(store, emap.id)));
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "items", "picture"}};
    for (const store::EmapSummary& emap : Emaps(store).List()) {
        Json::Value entry = ToData(emap);
        entry["item_num"] = emap.item_count;
        data.append(entry);
        rows.push_back({std::to_string(emap.id), emap.name, std::to_string(emap.item_count), emap.image});
    }
    console.Answer(Table(rows), data);
}

void Show(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Emap emap = RequireEmap(store, request.id);
    const std::vector<EmapItem> items = Emaps(store).Items(emap.id);
    Json::Value data = ToData(emap);
    data["items"] = emap::ToJson(items);
    console.Answer(emap.name + "\n\n" + Table(ItemRows(items)), data);
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Emaps(store).Remove(request.id);
    emap::Pictures(store, console.Installation().Home()).Sweep();
    Json::Value data;
    data["id"] = request.id;
    console.Answer("The e-map " + std::to_string(request.id) + " is gone.", data);
}

void Export(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Emap emap = RequireEmap(store, request.id);
    Json::Value file;
    file["lookhaven_emap"] = kFileVersion;
    file["name"] = emap.name;
    file["hideItemName"] = emap.hide_names;
    file["smallItemSize"] = emap.small_items;
    file["items"] = emap::ToJson(Emaps(store).Items(emap.id));
    file["picture"] = base::ToBase64(emap::Pictures(store, console.Installation().Home()).Read(emap.image));
    base::WriteFileAtomically(request.file, ToJson(file) + "\n", 0644);
    Json::Value data;
    data["id"] = emap.id;
    data["file"] = request.file;
    console.Answer("The e-map " + emap.name + " stands in " + request.file + ".", data);
}

Json::Value ReadEmapFile(const std::string& path) {
    const std::string text = ReadBounded(path, 2 * emap::kMaxPictureBytes);
    Json::Value file;
    Json::CharReaderBuilder builder;
    builder["stackLimit"] = 8;
    std::string ignored;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    try {
        if (!reader->parse(text.data(), text.data() + text.size(), &file, &ignored)) {
            file = Json::nullValue;
        }
    } catch (const Json::Exception&) {
        file = Json::nullValue;  // nested too deeply
    }
    if (!file.isObject() || file["lookhaven_emap"] != kFileVersion || !file["name"].isString() ||
        !file["picture"].isString() || !file["hideItemName"].isBool() || !file["smallItemSize"].isBool()) {
        throw Failure(kDataError, path + " is no e-map that lookhaven emap export wrote");
    }
    return file;
}

void Import(const Console& console, const Request& request) {
    const Json::Value file = ReadEmapFile(request.file);
    const std::optional<std::string> picture = base::FromBase64(file["picture"].asString());
    if (!picture) {
        throw Failure(kDataError, "the picture in " + request.file + " is damaged");
    }
    std::vector<EmapItem> items = emap::ItemsFromJson(file["items"]);
    store::Store store = console.OpenStore();
    const std::size_t all = items.size();
    std::erase_if(items, [&](const EmapItem& item) { return !Emaps(store).Knows(item); });
    Emap wanted{.name = request.name.value_or(file["name"].asString())};
    const Emap emap = AddFilled(store, wanted, [&](int id) {
        emap::Pictures(store, console.Installation().Home()).Put(id, *picture);
        Emap filled = RequireEmap(store, id);
        filled.hide_names = file["hideItemName"].asBool();
        filled.small_items = file["smallItemSize"].asBool();
        Emaps(store).ReplaceItems(filled, items);
    });
    Json::Value data = ToData(emap);
    data["items_left_out"] = static_cast<Json::UInt64>(all - items.size());
    console.Answer("The e-map " + emap.name + " has the id " + std::to_string(emap.id) + "; " +
                       std::to_string(all - items.size()) + " items were left out, since there is no such device here.",
                   data);
}

void TakeFlags(CLI::App& command, const std::shared_ptr<Request>& request) {
    command.add_flag("--hide-names,!--show-names", request->hide_names, "Whether names stand beside the items");
    command.add_flag("--small-items,!--large-items", request->small_items, "How large the items are drawn");
}

}  // namespace

void AddEmap(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("emap", "E-maps: floor plans with devices on them")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    const auto take_id = [&](CLI::App* taker) { taker->add_option("id", request->id, "The map's id")->required(); };
    CLI::App* add = command("add", "Makes a map of a picture: PNG, JPEG, WebP or SVG, at most 16 MiB", Add);
    add->add_option("name", request->name, "What it is called")->required();
    add->add_option("picture", request->file, "The picture's file; \"-\" for standard input")->required();
    TakeFlags(*add, request);
    CLI::App* set = command("set", "Changes what is given and leaves the rest", Change);
    take_id(set);
    set->add_option("--name", request->name, "What it is called");
    set->add_option("--picture", request->file, "Another picture's file");
    TakeFlags(*set, request);
    group->add_subcommand("list", "Lists the maps")->callback([&console] { List(console); });
    take_id(command("show", "Shows what is placed on a map", Show));
    take_id(command("remove", "Removes a map with its picture; devices stay", Remove));
    CLI::App* out = command("export", "Writes a map with its picture and items into one file", Export);
    take_id(out);
    out->add_option("file", request->file, "The file to write")->required();
    CLI::App* in = command("import", "Makes a map of such a file; items of unknown devices are left out", Import);
    in->add_option("file", request->file, "The file to read")->required();
    in->add_option("--name", request->name, "Another name than the file's");
    AddEmapItem(*group, console);
}

}  // namespace lookhaven::cli
