// SPDX-License-Identifier: Apache-2.0
//
// What a camera's device is able to do.
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

    // Loads the capabilities of the camera's device from the record, never from the device itself. Returns 0, or
    // non-zero when they are unknown.
    int LoadByCam(const Camera& camera);

    // Non-zero when the device sends sound. Its target and functor are owned by this handler.
    CapFunctor<unsigned int> m_SoundSupport;

  private:
    std::unique_ptr<DPObjectBase> m_pDevice;
    std::unique_ptr<MemFuncBase> m_pSoundSupport;
};

class LH_PLATFORM_API CamCapUtils {
  public:
    // The PTZ abilities that the user may use on the camera's live stream, as bits; 0 for none.
    static unsigned int GetLiveStmPtzCapByUserName(const DevCapHandler& devCap, const Camera& camera,
                                                   const std::string& userName);
};
