// SPDX-License-Identifier: Apache-2.0
//
// lookhaven demo setup: four cameras of test patterns and a viewer, to try everything without a camera.
#include <algorithm>

#include "standalone/cli/commands.h"
#include "standalone/store/cameras.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::VideoType;

constexpr const char* kViewer = "viewer";
constexpr const char* kDeniedCamera = "Parking";

std::vector<Camera> DemoCameras() {
    return {
        {.name = "Entrance",
         .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Entrance", 1280, 720, 25},
                      {1, "test:mjpeg?size=640x360&fps=25&label=Entrance", 640, 360, 25}}},
        {.name = kDeniedCamera,
         .video_type = VideoType::kH264,
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

void Setup(const Console& console) {
    store::Store store = console.OpenStore();
    store::Cameras cameras(store);
    store::Users users(store);
    const bool viewer_missing = !users.FindByName(kViewer);
    const std::string password = viewer_missing ? ReadPassword(kViewer, true) : "";
    const std::vector<Camera> known = cameras.List();
    int added = 0;
    int denied = 0;
    for (const Camera& wanted : DemoCameras()) {
        const int id = AddMissing(cameras, wanted, known, added);
        denied = wanted.name == kDeniedCamera ? id : denied;
    }
    if (viewer_missing) {
        users.Deny(users.Add(kViewer, password, store::Privilege::kViewer).id, denied);
    }
    Json::Value data;
    data["cameras_added"] = added;
    data["viewer_added"] = viewer_missing;
    console.Answer("The demo is set up: " + std::to_string(added) + " cameras were added" +
                       (viewer_missing ? ", and the account viewer." : "."),
                   data);
}

}  // namespace

void AddDemo(CLI::App& program, Console& console) {
    program.add_subcommand("demo", "Test patterns instead of cameras")
        ->require_subcommand(1)
        ->add_subcommand("setup", "Adds four cameras and the account viewer, whose password is asked for")
        ->callback([&console] { Setup(console); });
}

}  // namespace lookhaven::cli
