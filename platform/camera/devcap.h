// SPDX-License-Identifier: Apache-2.0
//
// Capabilities of camera devices.
#pragma once

#include <memory>
#include <string>

#include "platform/camera/camera.h"
#include "platform/export.h"
#include "platform/interface/handlerutils.h"

class LH_PLATFORM_API DevCapHandler {
  public:
    DevCapHandler();
    ~DevCapHandler();
    DevCapHandler(const DevCapHandler&) = delete;
    DevCapHandler& operator=(const DevCapHandler&) = delete;

    // Loads the capabilities from the camera's record, never from the device itself. Returns 0, or non-zero when they
    // are unknown; one such camera fails the whole camera list.
    int LoadByCam(const Camera& camera);

    // Non-zero when the device has sound. Usable after LoadByCam; this handler owns its target and functor.
    CapFunctor<unsigned int> m_SoundSupport;

  private:
    std::unique_ptr<DPObjectBase> m_pDevice;
    std::unique_ptr<MemFuncBase> m_pSoundSupport;
};

class LH_PLATFORM_API CamCapUtils {
  public:
    // The PTZ capabilities that the user may use on the camera's live stream, as bits that go to the client; 0 for
    // none.
    static unsigned int GetLiveStmPtzCapByUserName(const DevCapHandler& devCap, const Camera& camera,
                                                   const std::string& userName);
};
