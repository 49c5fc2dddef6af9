// SPDX-License-Identifier: Apache-2.0
//
// lookhaven backup, restore: an installation's records, pictures of e-maps and certificate in one file.
#include <string>

#include <fcntl.h>

#include "standalone/backup/backup.h"
#include "standalone/base/file.h"
#include "standalone/base/version.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/new_file.h"
#include "standalone/cli/running.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::string file;
    bool with_certificate = false;
};

Json::Value ToJson(const backup::Summary& summary) {
    return Object("records", summary.records, "pictures", summary.pictures, "certificate", summary.has_certificate);
}

void Backup(const Console& console, const Request& request) {
    backup::Summary summary;
    WriteNewFile(request.file, [&](int file) {
        store::Store store = console.OpenStore();
        summary = backup::Write(
            console.Installation(), store, file,
            request.with_certificate ? backup::Certificate::kIncluded : backup::Certificate::kLeftOut, base::kVersion);
    });
    console.Answer(ToJson(summary), "Backed up ", summary.records, " records and ", summary.pictures,
                   " pictures of e-maps to ", request.file,
                   ", which holds the passwords of cameras: keep it where nobody else reads it.");
}

void Restore(const Console& console, const Request& request) try {
    const base::FileDescriptor file = base::OpenFile(request.file, O_RDONLY);
    const base::Installation installation = console.Installation();
    RequireStopped(installation);
    const backup::Summary summary = backup::Restore(installation, file.Get());
    console.Answer(ToJson(summary), "Restored ", summary.records, " records and ", summary.pictures,
                   " pictures of e-maps. Mount the disks with the recordings where they were, and run lookhaven verify"
                   " --repair before the first start: it finds what was recorded since the backup.");
} catch (const backup::Malformed& error) {
    throw Failure(kDataError, request.file, ": ", error.what());
}

}  // namespace

void AddBackup(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("backup", "Writes records, e-maps and, on request, the certificate to a file, while running", Backup)
        .Option("file", group.request().file, "A file that does not exist yet, such as backup.tar.zst", Required)
        .Flag("--certificate", group.request().with_certificate,
              "Also the certificate, its key, and the key that signs exports");
    group.Add("restore", "Restores a backup into an installation that was just set up and is stopped", Restore)
        .Option("file", group.request().file, "The backup", Required);
}

}  // namespace lookhaven::cli
