// SPDX-License-Identifier: Apache-2.0
//
// What the shared library gives to live_view.cpp, which alone calls it.
#pragma once

#include "standalone/remote/live_view.h"

// As remote::FetchLiveView.
extern "C" __attribute__((visibility("default"))) void
LookhavenFetchLiveView(const lookhaven::remote::Host& host, const lookhaven::remote::LiveRequest& request,
                       lookhaven::remote::LiveSink& sink);
