// SPDX-License-Identifier: Apache-2.0
//
// A host with footage of three cameras, of which a viewer may play back the first alone.
#pragma once

#include <filesystem>
#include <string>

#include <gtest/gtest.h>

#include "standalone/store/users.h"
#include "test/support/footage/footage.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;

class EventApi : public testing::Test {
  protected:
    Answer Ask(const std::string& query, const std::string& form = "", bool as_viewer = false) const {
        return host_.Ask("api=VEXO." + query, as_viewer ? viewer_ : admin_, {}, form);
    }

    HostUnderTest host_;
    std::filesystem::path folder_ = host_.Home().Home();
    test::Footage footage_{host_.Home().StoreUrl(), folder_};
    std::string admin_ = host_.LogIn().secret;
    // May play back camera 1 alone. Taking a right away ends the sessions that were there, so logs in afterwards.
    std::string viewer_ =
        (store::Users(footage_.Records()).Deny(2, 2),
         store::Users(footage_.Records()).Deny(2, 3, {store::CameraAccess::kPlayback}), host_.LogIn("guest").secret);
};

}  // namespace lookhaven::api
