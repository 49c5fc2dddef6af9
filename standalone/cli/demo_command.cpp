// SPDX-License-Identifier: Apache-2.0
//
// lookhaven demo: everything that can be tried without a camera.
#include <chrono>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <thread>

#include "standalone/base/clock.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/demo/events.h"
#include "standalone/demo/footage.h"
#include "standalone/demo/removal.h"
#include "standalone/demo/setup.h"
#include "standalone/store/events.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::optional<int> count;
    int days = 30;
    bool remove = false;
};

void SetUp(const Console& console) {
    store::Store store = console.OpenStore();
    const std::string password = demo::HasViewer(store) ? "" : ReadPassword(demo::kViewer, true);
    const auto [cameras, viewer, emaps] = demo::SetUp(store, console.Installation().Home(), password);
    console.Answer(Object("cameras_added", cameras, "viewer_added", viewer, "emaps_added", emaps), "Added ", cameras,
                   " demo cameras and ", emaps, " e-maps", viewer ? ", and the account viewer." : ".");
}

// Runs make, whose errors end the command.
template <typename Make>
demo::EventCounts OrFail(Make make) {
    try {
        return make();
    } catch (const demo::NotReady& error) {
        throw Failure(kDataError, error.what());
    } catch (const std::invalid_argument& error) {
        throw Failure(kUsage, error.what());
    }
}

Json::Value ToData(const demo::EventCounts& added) {
    return Object("events_added", added.events, "marks_added", added.marks);
}

void RecordFootage(const Console& console) {
    store::Store store = console.OpenStore();
    const demo::EventCounts added = OrFail([&] { return demo::RecordFootage(store, base::WallSeconds()); });
    console.Answer(ToData(added), "Recorded ", added.events, " events of the last days with ", added.marks,
                   " alerts and POS transactions.");
}

void RemoveEvents(const Console& console) {
    store::Store store = console.OpenStore();
    const int removed = store::Events(store).RemoveDemo();
    console.Answer(Object("removed", removed), "Removed ", removed, " generated events, alerts and POS transactions.");
}

void Remove(const Console& console) {
    store::Store store = console.OpenStore();
    const std::filesystem::path home = console.Installation().Home();
    demo::RemovalResult removed = demo::Remove(store, home);
    for (int tries = 0; removed.growing > 0 && tries < 30; ++tries) {
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        removed = demo::Remove(store, home);
    }
    if (removed.growing > 0) {
        throw Failure(kUnavailable, "the demo's cameras are disabled, but ", removed.growing,
                      " of their recordings are still open: start the recorder, which closes them, and try again");
    }
    console.Answer(
        Object("cameras", removed.cameras, "emaps", removed.emaps, "recordings", removed.recordings), "Removed ",
        removed.cameras, " demo cameras, ", removed.emaps, " e-maps and ", removed.recordings, " recordings.",
        demo::HasViewer(store) ? "\nThe account viewer is kept: lookhaven user remove viewer removes it." : "");
}

void GenerateEvents(const Console& console, const Request& request) {
    if (request.remove) {
        return RemoveEvents(console);
    }
    if (!request.count) {
        throw Failure(kUsage, "give a number with --count, or --remove: see lookhaven demo events --help");
    }
    store::Store store = console.OpenStore();
    const demo::EventCounts added =
        OrFail([&] { return demo::GenerateEvents(store, *request.count, request.days, base::WallSeconds()); });
    console.Answer(ToData(added), "Generated ", added.events, " events and ", added.marks,
                   " alerts and POS transactions, all without footage.");
}

}  // namespace

void AddDemo(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "demo", "Test patterns instead of cameras");
    Request& request = group.request();
    group.Add("setup",
              "Adds four cameras, two of them recorded, e-maps, and the account viewer; prompts for its password",
              SetUp);
    group.Add("footage", "Records some scenes of the last days, with alerts and POS transactions", RecordFootage);
    group.Add("remove", "Removes what setup, footage and events added, except the account", Remove);
    group.Add("events", "Generates events without footage, or removes them", GenerateEvents)
        .Option("--count", request.count, "Number of events", Satisfies(CLI::Range(1, 100'000'000)))
        .Option("--days", request.days, "Spread them over this many days up to now (default: 30)",
                Satisfies(CLI::Range(1, 10'000)))
        .Flag("--remove", request.remove, "Remove all generated events")
        .Exclude("--remove", "--count");
}

}  // namespace lookhaven::cli
