// SPDX-License-Identifier: Apache-2.0
//
// The methods of VEXO.Emap that add, change and remove maps, and the uploads of their pictures.
//
// Why so        A picture is the whole body of its request, so that none of it is parsed here; its parameters are in
//               the address. It is the only body larger than 1 MiB, and only a manager's is read at all.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// Whether the call's body is a picture. Looks at query and headers only.
bool IsPictureUpload(const Call& call);

std::string ListEmaps(const Call& call);
std::string AddEmap(const Call& call);
std::string SetEmapPicture(const Call& call);
std::string RenameEmap(const Call& call);
std::string RemoveEmap(const Call& call);
// The web server asks it before it takes a picture's bytes.
std::string MayUpload(const Call& call);

}  // namespace lookhaven::api
