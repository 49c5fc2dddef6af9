// SPDX-License-Identifier: Apache-2.0
//
// Devices on e-maps beside cameras, the ports of devices, and the ids that this host gives to devices of its recording
// servers.
#pragma once

#include <map>
#include <string>

#include "platform/export.h"

// A box of inputs and outputs. A record is a value.
class LH_PLATFORM_API IOModule {
  public:
    // Each returns 0, or non-zero when there is no such module; then the record is unchanged.
    int Load(int moduleId);
    int LoadByIdOnRecServer(int idOnServer, int serverId);
    // The module's id on this host.
    int GetId() const;
    std::string GetName() const;

  private:
    int m_Id = 0;
    std::string m_Name;
};

// A till. A record is a value.
class LH_PLATFORM_API POS {
  public:
    // As those of IOModule.
    int Load(int posId);
    int LoadByIdOnRecServer(int idOnServer, int serverId);
    // The camera that watches the till, by its id on the till's own server; 0 for none.
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
    // Adds the type of each port under its index.
    void GetType(std::map<int, int>& types) const { types.insert(m_Types.begin(), m_Types.end()); }

  private:
    std::map<int, int> m_Types;
};

// By the device's id on this host. ids: decimal, ascending, joined by ",".
LH_PLATFORM_API std::map<int, CamDetSetting> GetCamDetMap(const std::string& ids);
LH_PLATFORM_API std::map<int, CamDeviceOutput> GetCamDOMap(const std::string& ids);
LH_PLATFORM_API std::map<int, IOModuleSetting> GetIOModuleSettingMap(const std::string& ids);

// The id on this host of a device that a recording server owns; 0 when it is unknown.
LH_PLATFORM_API int GetCamIdOnHost(int serverId, int idOnServer);
LH_PLATFORM_API int GetIOModuleIdOnHost(int serverId, int idOnServer);

// The camera that watches the module's port: its id on this host, its recording server and its id there; all 0 for none.
LH_PLATFORM_API void GetPairedCam(int moduleId, int portIdx, int& camId, int& camServerId, int& camIdOnServer);
