// SPDX-License-Identifier: Apache-2.0
//
// Search for recorded events of several cameras.
#pragma once

#include "webapi/include/lhwebapihandler.h"

class MultiPlayerHandler : public LHHandlerBase<MultiPlayerHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Serves "EnumEvent" and "SearchAvaiDate"; any other method does nothing.
    void HandleProcess();
    // Each ends with an answer on the response.
    void HandleEnumEvent();
    void HandleSearchAvaiDate();
};
