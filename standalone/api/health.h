// SPDX-License-Identifier: Apache-2.0
//
// Whether the installation works at the moment: pictures come, they reach the disks, the store answers.
//
// Why so        A monitor asks every few seconds, so only what is cheap is looked at. `lookhaven doctor` looks at
//               everything, and says what to do.
#pragma once

#include <string>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

constexpr std::int64_t kMaxPictureAgeUs = 10'000'000;
constexpr std::int64_t kMaxWrittenAgeUs = 5'000'000;

struct Problem {
    std::string subject;  // "recorder", "camera", "mount" or "store"
    int id = 0;           // of the camera or mount
    std::string message;
};

// records: the store, or null when it could not be opened. Throws nothing for the sake of what it looks at: that is a
// problem of the list.
std::vector<Problem> FindProblems(const base::Installation& installation, store::Store* records);

}  // namespace lookhaven::api
