// SPDX-License-Identifier: Apache-2.0
//
// lookhaven doctor: looks at every part of a running installation and says what to do.
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <iterator>
#include <system_error>

#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/units.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/recording_status.h"
#include "standalone/ring/inventory.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

struct Finding {
    std::string problem;
    std::string remedy;
    bool is_chosen = false;  // somebody may want it so: said, but no fault
};
using Findings = std::vector<Finding>;

constexpr int kSocketTimeoutMs = 3000;

// The state folder holds secrets: cameras' passwords, the TLS key.
Findings CheckFolder(const base::Installation& installation) {
    Findings findings;
    for (const std::string& name :
         {std::string(), std::string("tls"), std::string("lookhaven.db"), std::string("store")}) {
        const std::filesystem::path path = name.empty() ? installation.Home() : installation.Home() / name;
        struct stat status {};
        if (::stat(path.c_str(), &status) != 0) {
            continue;
        }
        if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
            findings.push_back({path.string() + " is open to other users", "chmod go= " + path.string()});
        }
        if (status.st_uid != ::geteuid()) {
            findings.push_back(
                {path.string() + " belongs to another user", "run this as the user who runs the server"});
        }
    }
    return findings;
}

Findings CheckStore(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        for (const std::string& sentence : store.Check()) {
            const std::size_t colon = sentence.find(": ");
            findings.push_back({sentence.substr(0, colon), colon == std::string::npos
                                                               ? "restore the store from a backup"
                                                               : sentence.substr(colon + 2)});
        }
        const std::vector<store::User> users = store::Users(store).List();
        if (std::none_of(users.begin(), users.end(), [](const store::User& user) { return user.IsManager(); })) {
            findings.push_back({"no account may manage this installation", "lookhaven init --admin NAME"});
        }
    } catch (const store::SchemaError& error) {
        findings.push_back({error.what(), "lookhaven init"});
    } catch (const store::StoreError& error) {
        findings.push_back({error.what(), "check that the file or database server is there and that you have access"});
    }
    return findings;
}

// A camera with an address of HTTPS whose certificate may be anybody's.
Findings CheckCameras(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        for (const store::Camera& camera : store::Cameras(store).List()) {
            if (camera.insecure && std::ranges::any_of(camera.profiles, [](const store::CameraProfile& profile) {
                    return profile.source.starts_with("https:");
                })) {
                findings.push_back(
                    {Concat("the HTTPS certificate of camera ", camera.id, " is not verified"),
                     Concat("once an authority that this machine trusts has signed it, lookhaven camera set ",
                            camera.id, " --secure"),
                     true});
            }
        }
    } catch (const store::StoreError&) {
        return {};  // CheckStore reports it
    }
    return findings;
}

// What keeps recordings from being written to the mount.
Findings CheckMount(store::Store& store, const store::Mount& mount) {
    const std::string name = "the mount " + mount.name + " at " + mount.path;
    if (::access(mount.path.c_str(), F_OK) != 0) {
        return {{name + " is not there", Concat("mount its disk, or lookhaven mount set ", mount.id, " --path")}};
    }
    const auto folder = maintenance::OpenMount(store, mount);
    if (!folder) {
        // A mount point without its disk has no marker: nothing that marks it may be advised.
        return {{maintenance::MountFolder::ReadMarker(mount.path)
                     ? Finding{name + " holds recordings of another mount or installation",
                               Concat("mount its own disk, or lookhaven mount set ", mount.id, " --take-over")}
                     : Finding{name + " has no marker: its disk is not mounted", "mount its disk"}}};
    }
    Findings findings;
    if (::access(mount.path.c_str(), R_OK | W_OK | X_OK) != 0) {
        findings.push_back({"you have no write access to " + name, "run this as the user who runs the server"});
    }
    const maintenance::MountSpace space = folder->Space();
    if (space.free_bytes < space.ReserveBytes()) {
        findings.push_back({Concat(name, " has only ", FormatSize(space.free_bytes), " left, recording needs ",
                                   FormatSize(space.ReserveBytes())),
                            "free space on its disk, or lower its limit with lookhaven mount set"});
    }
    const std::int64_t held = store::Events(store).Content(mount.id).size_bytes;
    if (mount.max_bytes > 0 && held > mount.max_bytes + mount.max_bytes / 10) {
        findings.push_back(
            {Concat(name, " holds ", FormatSize(held), " of recordings, above its limit of ",
                    FormatSize(mount.max_bytes)),
             "start the recorder, which removes the oldest; archived events stay, raise the limit for them"});
    }
    return findings;
}

// What the recorder's own work on the mounts meets.
Findings CheckMaintenance(const base::Installation& installation) {
    control::CommonConfig* config = control::MapCommonConfig(installation);
    Findings findings;
    if (config != nullptr && control::IsRecorderAlive(*config)) {
        for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation)) {
            if (status.state == maintenance::MountState::kInUse) {
                findings.push_back({Concat("mount ", status.mount, " is used by the recorder of another state folder"),
                                    "stop that recorder, or give this installation a mount of its own"});
            }
            if (status.state == maintenance::MountState::kFailing) {
                findings.push_back({Concat("the recorder's work on mount ", status.mount, " fails: ", status.reason),
                                    "check that disk; the work goes on by itself"});
            }
        }
    }
    return findings;
}

Findings CheckMounts(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        const std::vector<store::Mount> mounts = store::Mounts(store).List();
        if (mounts.empty()) {
            return {{"there is no mount to record to", "lookhaven init"}};
        }
        for (const store::Mount& mount : mounts) {
            std::ranges::move(mount.enabled ? CheckMount(store, mount) : Findings(), std::back_inserter(findings));
        }
    } catch (const store::StoreError&) {
        return {};  // CheckStore reports it
    } catch (const std::system_error& error) {
        findings.push_back({error.what(), "check the disk"});
    }
    return findings;
}

// Any answer shows that the host accepts connections, forks and responds.
bool HostAnswers(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const base::FileDescriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (!socket || path.size() >= sizeof address.sun_path) {
        return false;
    }
    std::memcpy(address.sun_path, path.data(), path.size());
    if (::connect(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        return false;
    }
    std::string head;
    for (const char* part : {"CONTENT_LENGTH", "0", "SCGI", "1", "REQUEST_METHOD", "GET", "REQUEST_URI", "/webapi",
                             "QUERY_STRING", "api=VEXO.Auth&version=1&method=Status"}) {
        head.append(part).push_back('\0');
    }
    const std::string request = std::to_string(head.size()) + ":" + head + ",";
    if (::send(socket.Get(), request.data(), request.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(request.size())) {
        return false;
    }
    pollfd wait{socket.Get(), POLLIN, 0};
    char byte = 0;
    return ::poll(&wait, 1, kSocketTimeoutMs) == 1 && ::recv(socket.Get(), &byte, 1, 0) == 1;
}

Findings CheckHost(const base::Installation& installation) {
    const std::string socket = installation.WebApiSocket().string();
    if (HostAnswers(socket)) {
        return {};
    }
    return {{"the web API host does not answer at " + socket,
             "start the server with script/server, or read the logs in " + installation.LogFolder().string()}};
}

Findings CheckRecorder(const base::Installation& installation) {
    const control::RecorderState state = control::FindRecorder(installation);
    if (state == control::RecorderState::kAlive) {
        return {};
    }
    if (state == control::RecorderState::kHangs) {
        return {
            {"the recorder hangs: nothing is recorded or shown live, and what it last told of the cameras is stale",
             "let it go on if somebody stopped it (pkill -CONT -f lookhaven-recorder), or else restart the server"}};
    }
    return {{control::MapCommonConfig(installation) == nullptr ? "the recorder has not run since the machine started"
                                                               : "the recorder does not run",
             "start the server with script/server, or read the logs in " + installation.LogFolder().string()}};
}

// Another host's recorder may record the cameras of a store that both share.
Findings CheckActiveRecorder(const base::Installation& installation) {
    control::CommonConfig* config = control::MapCommonConfig(installation);
    if (config == nullptr || !control::IsRecorderAlive(*config)) {
        return {};
    }
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        const std::string holder = store::RecorderLease(store).Current().holder;
        if (!holder.empty() && holder != store::RecorderName(installation)) {
            return {{"the cameras of this store are recorded by the recorder of " + holder,
                     "stop one of the two recorders, or give each a store of its own"}};
        }
    } catch (const store::StoreError&) {
        return {};  // CheckStore reports it
    }
    return {};
}

// What the recorder reports of each camera.
Findings CheckRecordings(const base::Installation& installation) {
    if (control::FindRecorder(installation) != control::RecorderState::kAlive) {
        return {};  // stale
    }
    Findings findings;
    for (const maintenance::RecordingStatus& state : maintenance::ReadRecordingStatus(installation)) {
        if (state.state != maintenance::RecordingState::kReady &&
            state.state != maintenance::RecordingState::kRecording) {
            const bool lacks_event_id = state.state == maintenance::RecordingState::kNoEventId;
            findings.push_back({Concat("camera ", state.camera, " is not recorded: ", maintenance::NameOf(state.state)),
                                lacks_event_id
                                    ? "mend the store, which gives out event ids; recording then resumes by itself"
                                    : "check that its mount is enabled and in its place with lookhaven mount "
                                      "list; recording then resumes by itself"});
        }
    }
    return findings;
}

Findings CheckSegments(const base::Installation& installation) {
    Findings findings;
    for (const ring::SegmentState& segment : ring::ListSegments(installation)) {
        const std::string name = Concat("the shared memory ", segment.shm_id, " of camera ", segment.id.camera);
        if (!segment.has_known_layout) {
            findings.push_back({name + " was created by another version",
                                Concat("restart the server; if it stays: ipcrm -m ", segment.shm_id)});
        } else if (!segment.writer_alive && segment.attached == 0) {
            findings.push_back({name + " was left behind", "start the recorder, which reuses or removes it"});
        }
    }
    return findings;
}

struct Check {
    const char* name;
    Findings (*run)(const base::Installation&);
};
constexpr Check kChecks[] = {{"folder", CheckFolder},
                             {"store", CheckStore},
                             {"cameras", CheckCameras},
                             {"mounts", CheckMounts},
                             {"host", CheckHost},
                             {"recorder", CheckRecorder},
                             {"active recorder", CheckActiveRecorder},
                             {"recordings", CheckRecordings},
                             {"maintenance", CheckMaintenance},
                             {"segments", CheckSegments}};

void Examine(const Console& console) {
    const base::Installation installation = console.Installation();
    Json::Value data = Json::arrayValue;
    std::string text;
    std::size_t count = 0;
    for (const Check& check : kChecks) {
        const Findings findings = check.run(installation);
        Json::Value list = Json::arrayValue;
        const auto faults = std::ranges::count(findings, false, &Finding::is_chosen);
        text += Concat(findings.empty() ? "ok       " : faults == 0 ? "note     " : "problem  ", check.name, "\n");
        for (const Finding& finding : findings) {
            list.append(Object("problem", finding.problem, "remedy", finding.remedy, "chosen", finding.is_chosen));
            text += "         " + finding.problem + "\n         do: " + finding.remedy + "\n";
        }
        data.append(Object("check", check.name, "ok", faults == 0, "findings", list));
        count += static_cast<std::size_t>(faults);
    }
    console.Answer(data, text);
    if (count > 0) {
        throw Failure(kFindings, count == 1 ? "there is one problem" : Concat("there are ", count, " problems"));
    }
}

}  // namespace

void AddDoctor(CLI::App& program, const Console& console) {
    CommandGroup<>(program, console).Add("doctor", "Checks the installation and says what to do", Examine);
}

}  // namespace lookhaven::cli
