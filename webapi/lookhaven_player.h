// SPDX-License-Identifier: Apache-2.0
//
// What the shared object exports to the web API framework: the table of its methods and their entry functions.
#pragma once

#include <cstdint>

#include "platform/export.h"
#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"

extern "C" {

// Serves one request. Exceptions of the platform and of JSON conversions pass through. The answer may be on standard
// output already when it returns.
using APIProcess = void (*)(VEXO::APIRequest* request, VEXO::APIResponse* response);

// Four machine words; a row of zeros ends a table.
struct APIRow {
    const char* m_szApi;
    std::int32_t m_Version;
    const char* m_szMethod;
    APIProcess m_Process;
};
static_assert(sizeof(APIRow) == 4 * sizeof(void*), "the framework walks rows of four words");

LH_PLATFORM_API extern const APIRow gTable[];
// Returns gTable; has no side effects.
LH_PLATFORM_API const APIRow* GetAPITable();

LH_PLATFORM_API void Process(VEXO::APIRequest* request, VEXO::APIResponse* response);
LH_PLATFORM_API void ProcessPlayEvent(VEXO::APIRequest* request, VEXO::APIResponse* response);
LH_PLATFORM_API void ProcessLoadCamera(VEXO::APIRequest* request, VEXO::APIResponse* response);
LH_PLATFORM_API void ProcessLiveviewSrc(VEXO::APIRequest* request, VEXO::APIResponse* response);

}  // extern "C"
