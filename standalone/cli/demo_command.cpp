// SPDX-License-Identifier: Apache-2.0
//
// lookhaven demo: cameras of test patterns, recorded and grouped, floor plans, a viewer, and events by the thousand, to try everything
// without a camera.
#include <algorithm>
#include <memory>

#include "standalone/base/clock.h"
#include "standalone/cli/commands.h"
#include "standalone/demo/demo_emaps.h"
#include "standalone/demo/demo_events.h"
#include "standalone/demo/demo_footage.h"
#include "standalone/demo/not_ready.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

using store::Camera;

constexpr const char* kViewer = "viewer";
constexpr const char* kDeniedCamera = "Parking";
constexpr const char* kGroup = "Yard";
constexpr std::int64_t kDemoLimitBytes = std::int64_t{4} << 30;
constexpr std::size_t kRecordedCameras = 2;

std::vector<Camera> DemoCameras() {
    return {
        {.name = "Entrance",
         .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Entrance", 1280, 720, 25},
                      {1, "test:mjpeg?size=640x360&fps=25&label=Entrance", 640, 360, 25}}},
        {.name = kDeniedCamera,
         .video_type = base::Codec::kH264,
         .audio = true,
         .profiles = {{0, "test:h264?size=1280x720&fps=25&audio=aac&label=Parking", 1280, 720, 25}}},
        {.name = "Warehouse",
         .enabled = false,
         .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Warehouse", 1280, 720, 25}}},
        {.name = "Gate",
         .ptz = true,
         .audio = true,
         .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Gate", 1280, 720, 25}}},
    };
}

// The id of each demo camera; those that are there, by name, stay as they are.
int AddMissing(store::Cameras& cameras, const Camera& wanted, const std::vector<Camera>& known, int& added) {
    const auto found =
        std::find_if(known.begin(), known.end(), [&](const Camera& camera) { return camera.name == wanted.name; });
    if (found != known.end()) {
        return found->id;
    }
    ++added;
    return cameras.Add(wanted);
}

// The first cameras are recorded and make a group. Cameras that were there before keep their plan.
void RecordAndGroup(store::Store& store, const std::vector<int>& ids, int first_added) {
    store::RecordingPlans plans(store);
    store::CameraGroup group{0, kGroup, {}};
    for (const int id : ids) {
        group.camera_ids.insert(id);
        if (id >= first_added) {
            plans.Set(id, {.mode = store::RecordMode::kAlways});
        }
    }
    store::Groups groups(store);
    const std::vector<store::CameraGroup> known = groups.List();
    if (std::none_of(known.begin(), known.end(), [](const auto& each) { return each.name == kGroup; })) {
        groups.Add(group);
    }
}

// A trial keeps little. Only where nothing has been recorded yet: a lower limit removes recordings.
void LimitDefaultMount(store::Store& store) {
    store::Mounts mounts(store);
    std::optional<store::Mount> mount = mounts.FindForPlan(0);
    if (mount && store::Events(store).Content(mount->id).events == 0 &&
        (mount->max_bytes == 0 || mount->max_bytes > kDemoLimitBytes)) {
        mount->max_bytes = kDemoLimitBytes;
        mounts.Update(*mount);
    }
}

void Setup(const Console& console) {
    store::Store store = console.OpenStore();
    store::Cameras cameras(store);
    store::Users users(store);
    const bool viewer_missing = !users.FindByName(kViewer);
    const std::string password = viewer_missing ? ReadPassword(kViewer, true) : "";
    const std::vector<Camera> known = cameras.List();
    int added = 0;
    int denied = 0;
    std::vector<int> recorded;
    std::map<std::string, int> ids;
    for (const Camera& wanted : DemoCameras()) {
        const int id = AddMissing(cameras, wanted, known, added);
        ids[wanted.name] = id;
        denied = wanted.name == kDeniedCamera ? id : denied;
        if (recorded.size() < kRecordedCameras) {
            recorded.push_back(id);
        }
    }
    RecordAndGroup(store, recorded, known.empty() ? 1 : known.back().id + 1);
    if (known.empty()) {
        LimitDefaultMount(store);
    }
    if (viewer_missing) {
        users.Deny(users.Add(kViewer, password, store::Privilege::kViewer).id, denied);
    }
    const int maps = demo::AddDemoEmaps(store, console.Installation().Home(), ids, users.FindByName(kViewer)->id);
    Json::Value data;
    data["cameras_added"] = added;
    data["viewer_added"] = viewer_missing;
    data["emaps_added"] = maps;
    console.Answer("The demo is set up: " + std::to_string(added) + " cameras and " + std::to_string(maps) +
                       " e-maps were added" + (viewer_missing ? ", and the account viewer." : "."),
                   data);
}

// Runs make; what the demo cannot do ends the command.
template <typename Make>
auto OrFail(Make make) {
    try {
        return make();
    } catch (const demo::NotReady& error) {
        throw Failure(kDataError, error.what());
    } catch (const std::invalid_argument& error) {
        throw Failure(kUsage, error.what());
    }
}

void MakeFootage(const Console& console) {
    store::Store store = console.OpenStore();
    const demo::DemoFootage made = OrFail([&] { return demo::RecordDemoFootage(store, base::WallMillis() / 1000); });
    Json::Value data;
    data["events_added"] = made.events;
    data["marks_added"] = made.marks;
    console.Answer("Recorded " + std::to_string(made.events) + " events of the last days with " +
                       std::to_string(made.marks) + " alerts and sales.",
                   data);
}

struct EventRequest {
    int count = 0;
    int days = 30;
    bool remove = false;
};

void MakeEvents(const Console& console, const EventRequest& request) {
    store::Store store = console.OpenStore();
    Json::Value data;
    if (request.remove) {
        const int removed = store::Events(store).RemoveDemo();
        data["removed"] = removed;
        console.Answer("What was made up is gone: " + std::to_string(removed) + " events, alerts and sales.", data);
        return;
    }
    const demo::DemoAmount made =
        OrFail([&] { return demo::AddDemoEvents(store, request.count, request.days, base::WallMillis() / 1000); });
    data["events_added"] = made.events;
    data["marks_added"] = made.marks;
    console.Answer("Made up " + std::to_string(made.events) + " events and " + std::to_string(made.marks) +
                       " alerts and sales, all without footage.",
                   data);
}

}  // namespace

void AddDemo(CLI::App& program, Console& console) {
    CLI::App* demo = program.add_subcommand("demo", "Test patterns instead of cameras")->require_subcommand(1);
    demo->add_subcommand("setup",
                         "Adds four cameras, two of them recorded, and the account viewer, whose password is asked "
                         "for")
        ->callback([&console] { Setup(console); });

    demo->add_subcommand("footage", "Records some scenes of the last days, with alerts and sales, to look at")
        ->callback([&console] { MakeFootage(console); });

    CLI::App* events = demo->add_subcommand("events", "Makes up events for a trial, or removes them");
    auto request = std::make_shared<EventRequest>();
    CLI::Option* count = events->add_option("--count", request->count, "How many")->check(CLI::Range(1, 100'000'000));
    events->add_option("--days", request->days, "Spread over so many days up to now (else 30)")
        ->check(CLI::Range(1, 10'000));
    CLI::Option* remove = events->add_flag("--remove", request->remove, "Remove all that was made up")->excludes(count);
    events->callback([&console, request, count, remove] {
        if (count->empty() && remove->empty()) {
            throw Failure(kUsage, "say how many with --count, or --remove: see lookhaven demo events --help");
        }
        MakeEvents(console, *request);
    });
}

}  // namespace lookhaven::cli
