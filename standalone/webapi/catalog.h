// SPDX-License-Identifier: Apache-2.0
//
// The host's own API VEXO.Catalog: the camera groups, mounts and e-maps that the caller may see. Runs in a request process.
#pragma once

#include <string>

#include "standalone/binding/request_context.h"

namespace lookhaven::webapi {

constexpr const char* kCatalogApi = "VEXO.Catalog";

// The whole answer. The caller of the context must be known. Throws Failure 404.
std::string ServeCatalog(binding::RequestContext& context, int version, const std::string& method);

}  // namespace lookhaven::webapi
