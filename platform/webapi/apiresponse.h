// SPDX-License-Identifier: Apache-2.0
//
// The answer that a handler returns to the web API framework.
#pragma once

#include <json/json.h>

#include "platform/export.h"

namespace VEXO {

// Nothing is written before the entry function returns. The last of SetSuccess and SetError counts; a handler that
// calls neither leaves the answer to the framework.
//
// Thread safety: one thread.
class LH_PLATFORM_API APIResponse {
  public:
    // The framework's own data behind the response.
    struct Context;
    // Borrows context, which outlives the response.
    explicit APIResponse(Context& context);

    // The JSON answer {"success": true, "data": data}.
    void SetSuccess(const Json::Value& data);
    // The JSON answer {"success": false, "error": {"code": code, "data": data}}.
    void SetError(int code, const Json::Value& data);
    // false: the handler has written its own bytes to standard output, and the framework adds nothing to them.
    void SetEnableOutput(bool enable);

  private:
    Context* m_pContext;
};

}  // namespace VEXO
