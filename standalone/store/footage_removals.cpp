// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/footage_removals.h"

#include <sstream>
#include <string>

#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/settings.h"

namespace lookhaven::store {

namespace {

// Its value is, for each camera, its id and when it was removed, with spaces between.
constexpr const char* kSetting = "footage_removals";
constexpr std::int64_t kDayS = 86'400;
constexpr int kMaxCameras = 1'000;

}  // namespace

void FootageRemovals::Add(int camera, std::int64_t now_s) {
    Settings settings(store_);
    std::istringstream known(settings.Find(kSetting).value_or(""));
    std::string all = std::to_string(camera) + ' ' + std::to_string(now_s);
    int id = 0;
    std::int64_t removed_s = 0;
    for (int count = 1; count < kMaxCameras && known >> id >> removed_s; ++count) {
        if (now_s - removed_s < kDayS) {
            all += ' ' + std::to_string(id) + ' ' + std::to_string(removed_s);
        }
    }
    settings.Set(kSetting, all);
}

std::vector<int> FootageRemovals::Cameras() {
    std::vector<int> cameras;
    std::istringstream known(Settings(store_).Find(kSetting).value_or(""));
    int id = 0;
    std::int64_t removed_s = 0;
    while (known >> id >> removed_s) {
        cameras.push_back(id);
    }
    return cameras;
}

void FootageRemovals::BeginDeletions() {
    Events events(store_);
    for (const int camera : Cameras()) {
        EventFilter any;
        any.camera_ids = {camera};
        any.limit = 1;
        if (!store::Cameras(store_).Find(camera) && !events.List(any).empty()) {
            events.BeginDeletionOfCamera(camera);
        }
    }
}

}  // namespace lookhaven::store
