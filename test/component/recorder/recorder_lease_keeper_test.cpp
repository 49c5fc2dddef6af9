// SPDX-License-Identifier: Apache-2.0
//
// Two recorders on one store.
#include "standalone/recorder/recorder_lease_keeper.h"

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/store/store.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::recorder {
namespace {

TEST(RecorderLeaseKeeper, OneRecorderAtATimeHoldsAStore) {
    const test::ArchiveFolder home;
    base::Installation::CreateFolders(home.Path());
    store::Store::Migrate(base::Installation(home.Path()).StoreUrl());
    store::Store store = store::Store::Open(base::Installation(home.Path()).StoreUrl());
    std::int64_t now_us = 0;
    RecorderLeaseKeeper first("A", [&] { return now_us; });
    RecorderLeaseKeeper second("B", [&] { return now_us; });
    for (; now_us < 10 * LeaseTimes().expiry_us; now_us += LeaseTimes().renew_us) {
        EXPECT_TRUE(first.Hold(store, 1));
        EXPECT_FALSE(second.Hold(store, 1));
    }
    EXPECT_TRUE(RecorderLeaseKeeper("A", [&] { return now_us; }).Hold(store, 7)) << "started again";
    EXPECT_EQ(store::RecorderLease(store).Current().first_reserved_id, 7);
    now_us += LeaseTimes().renew_us;
    EXPECT_FALSE(first.Hold(store, 1));
    EXPECT_FALSE(second.Hold(store, 1));
    now_us += LeaseTimes().expiry_us;
    EXPECT_TRUE(second.Hold(store, 1)) << "nobody renews it";
    first.Release(store);
    EXPECT_FALSE(first.Hold(store, 1)) << "what it has lost it cannot give back";
    second.Release(store);
    EXPECT_TRUE(first.Hold(store, 1)) << "at once";
}

}  // namespace
}  // namespace lookhaven::recorder
