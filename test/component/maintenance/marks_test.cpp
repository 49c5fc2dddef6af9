// SPDX-License-Identifier: Apache-2.0
//
// When an alert's footage is complete, and when a clock is trusted to delete by it.
#include "standalone/maintenance/marks.h"

#include <string>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/maintenance/clock_watch.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/marks.h"
#include "test/support/folder.h"
#include "test/support/footage/footage.h"

namespace lookhaven::maintenance {
namespace {

constexpr std::int64_t kNoon = 1772366400;

TEST(ClockWatch, TrustsAnHourWithoutAStepOfADay) {
    ClockWatch watch;
    constexpr std::int64_t kHourUs = std::int64_t{3600} * 1'000'000;
    const struct {
        std::int64_t monotonic_us, wall_s;
        bool is_trusted;
    } rows[] = {{5, 1000, false},
                {5 + kHourUs - 1, 4599, false},
                {5 + kHourUs, 4600, true},
                {5 + kHourUs, 4600 + 86'000, true},  // put right
                {6 + kHourUs, kNoon, false},
                {6 + 2 * kHourUs, kNoon + 3600, true},
                {7 + 2 * kHourUs, 0, false}};
    for (const auto& row : rows) {
        EXPECT_EQ(watch.IsTrusted(row.monotonic_us, row.wall_s), row.is_trusted) << row.monotonic_us;
    }
}

TEST(Marks, AMarkIsCompleteOnceNoRowOfItCanCome) {
    const test::TemporaryFolder folder;
    base::Installation::CreateFolders(folder);
    store::Store::Migrate(base::Installation(folder).StoreUrl());
    test::Footage footage(base::Installation(folder).StoreUrl(), folder);
    MountFolder::WriteMarker(footage.Mount(), MarkerFor(footage.Records(), footage.MountId()));
    const int event = footage.Record(1, kNoon, 60);
    store::Marks marks(footage.Records());
    const auto add = [&](int camera, std::int64_t at_s) {
        return marks.Add(store::MarkKind::kAlert, camera, at_s, 1, "").id;
    };
    const int whole = add(1, kNoon + 30);
    const int partly = add(1, kNoon + 58);  // its row ends before it
    const int none = add(2, kNoon + 30);
    bool ended = false;
    const auto complete = [&] {
        for (const int mount : {footage.MountId(), 0}) {
            CompleteMarks(footage.Records(), mount, kNoon + 86400, [&](const store::Mark&) { return ended; });
        }
        std::string states;
        for (const int id : {whole, partly, none}) {
            states += std::string(NameOf(marks.Find(store::MarkKind::kAlert, id)->state)) + " ";
        }
        return states;
    };
    EXPECT_EQ(complete(), "saved pending pending ") << event;
    ended = true;
    EXPECT_EQ(complete(), "saved saved missed ");
}

}  // namespace
}  // namespace lookhaven::maintenance
