// SPDX-License-Identifier: Apache-2.0
//
// Which folder is the state folder of an installation.
#pragma once

#include <filesystem>

namespace lookhaven::base {

// The folder named by LOOKHAVEN_HOME, else the one that the programs were built for: "var" in the checkout. Never one
// that depends on the working folder.
std::filesystem::path DefaultHome();

// Whether lookhaven init, the first start or a service has left files in the folder. Any other is not ours to change.
bool IsStateFolder(const std::filesystem::path& home);

}  // namespace lookhaven::base
