// SPDX-License-Identifier: Apache-2.0
//
// lookhaven store: where the records are kept, and moving them to another engine or place.
#include <iostream>
#include <string>

#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/running.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/copy.h"
#include "standalone/store/hosts.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::string url;
};

// A password has no place on the screen: it may stand before the host, among what follows "?", and in connection
// options.
std::string WithoutPassword(const std::string& url) {
    const std::size_t begin = url.find("://");
    if (begin == std::string::npos) {
        return url.starts_with("sqlite:") ? url : "postgresql: (connection options)";
    }
    const std::string address = url.substr(0, url.find('?'));
    const std::size_t at = address.rfind('@');
    const std::size_t colon = address.find(':', begin + 3);
    return at != std::string::npos && colon < at ? address.substr(0, colon) + address.substr(at) : address;
}

void Show(const Console& console) {
    static_cast<void>(console.OpenStore());
    const std::string url = WithoutPassword(console.Installation().StoreUrl());
    console.Answer(Object("store", url, "schema", store::Store::SchemaVersion()), url);
}

void Move(const Console& console, const Request& request) {
    std::string url = request.url;
    if (url == "-" && !std::getline(std::cin, url)) {
        throw Failure(kDataError, "no address was given on standard input");
    }
    if (url.starts_with("sqlite:") && !url.starts_with("sqlite:/")) {
        throw Failure(kDataError, "the path of a store is absolute: sqlite:/PATH");
    }
    const base::Installation installation = console.Installation();
    store::Store source = console.OpenStore();
    if (!store::Hosts(source).All().empty()) {
        throw Failure(kDataError, "hosts share this store, so it is moved by PostgreSQL's own means: stop all hosts,"
                                  " dump and restore the database, and write its address into the file store of each");
    }
    RequireStopped(installation);
    RequireNoOtherRecorder(installation, source);
    if (url == installation.StoreUrl()) {
        throw Failure(kDataError, "the records are there already");
    }
    const std::string before = WithoutPassword(installation.StoreUrl());
    store::Store::Migrate(url);
    store::Store target = store::Store::Open(url);
    const std::int64_t records = store::CopyRecords(source, target, store::CopySessions::kYes);
    emap::Pictures(target, installation.Home()).Share();
    installation.SetStoreUrl(url);
    console.Answer(Object("store", WithoutPassword(url), "before", before, "records", records), "Moved ", records,
                   " records to ", WithoutPassword(url), ". Those in ", before,
                   " were left as they are, and are used no more.");
}

}  // namespace

void AddStore(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "store", "Where the records are kept");
    group.Add("show", "Shows where the records are kept", [](const Console& shown_on) { Show(shown_on); });
    group.Add("move", "Moves all records to another store, while Lookhaven is stopped", Move)
        .Option(
            "url", group.request().url,
            "postgresql://USER@HOST/DATABASE or sqlite:/PATH; - reads it from standard input, which keeps a password"
            " out of the list of processes",
            Required);
}

}  // namespace lookhaven::cli
