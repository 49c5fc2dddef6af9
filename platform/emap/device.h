// SPDX-License-Identifier: Apache-2.0
//
// Devices on e-maps other than cameras, the ports of devices, and the local ids of devices of recording servers.
#pragma once

#include <map>
#include <string>

#include "platform/export.h"

// A module with digital input and output ports. A record is a value.
class LH_PLATFORM_API IOModule {
  public:
    // Each returns 0, or non-zero when there is no such module; then the record is unchanged. Load takes this host's
    // own modules only. Rights are not checked.
    int Load(int moduleId);
    int LoadByIdOnRecServer(int idOnServer, int serverId);
    // The module's id on this host.
    int GetId() const;
    std::string GetName() const;

  private:
    int m_Id = 0;
    std::string m_Name;
};

// A point-of-sale terminal. A record is a value.
class LH_PLATFORM_API POS {
  public:
    // As those of IOModule.
    int Load(int posId);
    int LoadByIdOnRecServer(int idOnServer, int serverId);
    // The camera paired with the terminal, by its id on the terminal's own server; 0 for none.
    int GetPairedCamIdOnRec() const;

  private:
    int m_PairedCamIdOnRec = 0;
};

// A camera's digital inputs.
class LH_PLATFORM_API CamDetSetting {
  public:
    explicit CamDetSetting(int inputCount = 0) : m_DICnt(inputCount) {}
    int GetDICnt() const { return m_DICnt; }

  private:
    int m_DICnt;
};

// A camera's digital outputs.
class LH_PLATFORM_API CamDeviceOutput {
  public:
    explicit CamDeviceOutput(int outputCount = 0) : m_DoCnt(outputCount) {}
    int GetDoCnt() const { return m_DoCnt; }

  private:
    int m_DoCnt;
};

// What a module's ports are.
class LH_PLATFORM_API IOModuleSetting {
  public:
    explicit IOModuleSetting(std::map<int, int> types = {}) : m_Types(std::move(types)) {}
    // Adds the port types by port index (3 input, 1 output); entries that types already has are kept.
    void GetType(std::map<int, int>& types) const { types.insert(m_Types.begin(), m_Types.end()); }

  private:
    std::map<int, int> m_Types;
};

// By the device's id on this host. ids: decimal, ascending, joined by ",". A device without settings may be missing.
LH_PLATFORM_API std::map<int, CamDetSetting> GetCamDetMap(const std::string& ids);
LH_PLATFORM_API std::map<int, CamDeviceOutput> GetCamDOMap(const std::string& ids);
LH_PLATFORM_API std::map<int, IOModuleSetting> GetIOModuleSettingMap(const std::string& ids);

// The id on this host of a device that a recording server owns; 0 when it is unknown.
LH_PLATFORM_API int GetCamIdOnHost(int serverId, int idOnServer);
LH_PLATFORM_API int GetIOModuleIdOnHost(int serverId, int idOnServer);

// The camera paired with the module's port: its id on this host, its recording server (0: this host) and its id there.
// Without one all are 0 or left alone, so the caller sets them to 0 first.
LH_PLATFORM_API void GetPairedCam(int moduleId, int portIdx, int& camId, int& camServerId, int& camIdOnServer);
