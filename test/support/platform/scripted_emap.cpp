// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform's e-maps and their devices. A device of server 2 has the local id 200 + its id there;
// camera 1 has two inputs and one output, port 0 of module 7 has type 4.
#include "platform/admission/slavehx.h"
#include "platform/emap/device.h"
#include "platform/emap/emap.h"
#include "test/support/platform/record.h"

using lookhaven::test::Call;
using lookhaven::test::Script;

namespace {

int Known(int id) {
    return Script().unknown_devices.count(id) != 0 ? -1 : 0;
}

}  // namespace

struct Emap::Record {};
Emap::Emap() = default;
Emap::~Emap() = default;
int Emap::Load(int emapId) {
    return Call("Emap::Load", emapId), Script().has_emap ? 0 : -1;
}
std::string Emap::GetImgName() const {
    return Script().image_name;
}
int Emap::GetItemNum() const {
    return static_cast<int>(Script().emap_items.size());
}
int Emap::GetItem(int index, __tag_EMAP_ITEM_INFO& item) const {
    const auto& found = Script().emap_items.at(static_cast<std::size_t>(index));
    item = found.value_or(item);
    return found ? 0 : -1;
}
bool Emap::GetHideItemName() const {
    return true;
}
bool Emap::GetSmallItemSize() const {
    return false;
}
std::string LoadEmapImgBase64String(const std::string& imageName, int& length) {
    length = 4;
    return Call("LoadEmapImgBase64String", imageName), "cGlj";
}

int Camera::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return Call("LoadByIdOnRecServer", idOnServer, serverId), Load(100 * serverId + idOnServer, 0, 0);
}
int IOModule::Load(int moduleId) {
    m_Id = moduleId;
    m_Name = "io" + std::to_string(moduleId);
    return Call("IOModule::Load", moduleId), Known(moduleId);
}
int IOModule::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return Load(100 * serverId + idOnServer);
}
int IOModule::GetId() const {
    return m_Id;
}
std::string IOModule::GetName() const {
    return m_Name;
}
int POS::Load(int posId) {
    m_PairedCamIdOnRec = posId + 1;
    return Call("POS::Load", posId), Known(posId);
}
int POS::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return Load(100 * serverId + idOnServer);
}
int POS::GetPairedCamIdOnRec() const {
    return m_PairedCamIdOnRec;
}

std::map<int, CamDetSetting> GetCamDetMap(const std::string& ids) {
    return Call("GetCamDetMap", ids), std::map<int, CamDetSetting>{{1, CamDetSetting(2)}};
}
std::map<int, CamDeviceOutput> GetCamDOMap(const std::string& ids) {
    return Call("GetCamDOMap", ids), std::map<int, CamDeviceOutput>{{1, CamDeviceOutput(1)}};
}
std::map<int, IOModuleSetting> GetIOModuleSettingMap(const std::string& ids) {
    return Call("GetIOModuleSettingMap", ids),
           std::map<int, IOModuleSetting>{{7, IOModuleSetting(std::map<int, int>{{0, 4}})}};
}
int GetCamIdOnHost(int serverId, int idOnServer) {
    return 100 * serverId + idOnServer;
}
int GetIOModuleIdOnHost(int serverId, int idOnServer) {
    return 100 * serverId + idOnServer;
}
void GetPairedCam(int moduleId, int portIdx, int& camId, int& camServerId, int& camIdOnServer) {
    if (portIdx >= 0) {  // otherwise no camera is paired, and nothing is stored
        camId = moduleId + 10 + portIdx;
        camServerId = 2;
        camIdOnServer = moduleId;
    }
}

SlaveHx::SlaveHx(std::string ip, int port, std::string cookie)
    : m_Ip(std::move(ip)),
      m_Port(port),
      m_Cookie(std::move(cookie)) {}
std::string SlaveHx::GetIP() const {
    return m_Ip;
}
int SlaveHx::GetPort() const {
    return m_Port;
}
std::string SlaveHx::GetCookie() const {
    return m_Cookie;
}
SlaveHxMgr::SlaveHxMgr(bool load) : m_Servers{{2, SlaveHx("192.0.2.2", 5002, "token")}} {
    Call("SlaveHxMgr", load);
}
std::map<int, SlaveHx> SlaveHxMgr::GetSlaveHxMap(bool onlyOnline, bool onlyEnabled, bool onlySameVersion) const {
    return Call("GetSlaveHxMap", onlyOnline, onlyEnabled, onlySameVersion), m_Servers;
}
