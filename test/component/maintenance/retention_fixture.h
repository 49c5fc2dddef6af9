// SPDX-License-Identifier: Apache-2.0
//
// A mount with footage, of which retention deletes.
#pragma once

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/retention.h"
#include "standalone/store/cameras.h"
#include "test/support/folder.h"
#include "test/support/footage/footage.h"

namespace lookhaven::maintenance {

inline constexpr std::int64_t kNoon = 1772366400;
inline constexpr std::int64_t kEventBytes = 1'572'864;
inline constexpr std::int64_t kNow = kNoon + 86400;

class RetentionTest : public testing::Test {
  protected:
    RetentionTest() { MountFolder::WriteMarker(footage_.Mount(), MarkerFor(footage_.Records(), footage_.MountId())); }

    DeletionResult Run(std::int64_t max_bytes, std::int64_t max_age_s = 0, AgeLimit age_limit = AgeLimit::kApplies,
                       int host = 0) {
        store::Mount mount = *store::Mounts(footage_.Records()).Find(footage_.MountId());
        mount.max_bytes = max_bytes;
        mount.max_age_s = max_age_s;
        DeletionResult deleted;
        EnforceRetention(footage_.Records(), mount, {kNow, age_limit, now_us_}, host, watch_, deleted);
        return deleted;
    }

    void LimitAge(int camera, std::int64_t max_age_s) {
        store::Cameras cameras(footage_.Records());
        store::Camera record = *cameras.Find(camera);
        record.max_age_s = max_age_s;
        cameras.Update(record);
    }

    std::vector<int> Left() {
        std::vector<int> ids;
        store::Events(footage_.Records())
            .Visit({.camera_ids = {1, 2, 3}, .end_s = kNow},
                   [&](const store::Event& event) { ids.push_back(event.id); });
        std::sort(ids.begin(), ids.end());
        return ids;
    }

    static std::string MakeStore(const std::filesystem::path& folder) {
        base::Installation::CreateFolders(folder);
        store::Store::Migrate(base::Installation(folder).StoreUrl());
        return base::Installation(folder).StoreUrl();
    }

    const test::TemporaryFolder folder_;
    test::Footage footage_{MakeStore(folder_), folder_};
    std::int64_t now_us_ = 0;
    DiskWatch watch_;
};

}  // namespace lookhaven::maintenance
