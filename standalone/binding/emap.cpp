// SPDX-License-Identifier: Apache-2.0
//
// E-maps and their devices on a host that keeps none yet: no map loads, no device but cameras is known, no recording
// server is managed, and no door is anybody's.
#include "platform/emap/emap.h"
#include "platform/admission/slavehx.h"
#include "platform/camera/camera.h"
#include "platform/emap/device.h"
#include "platform/privilege/privprofile.h"

namespace {

constexpr int kNotFound = -1;
constexpr int kNoDevice = 0;

}  // namespace

struct Emap::Record {};

Emap::Emap() = default;
Emap::~Emap() = default;

int Emap::Load(int) {
    return kNotFound;
}

std::string Emap::GetImgName() const {
    return {};
}

int Emap::GetItemNum() const {
    return 0;
}

int Emap::GetItem(int, __tag_EMAP_ITEM_INFO&) const {
    return kNotFound;
}

bool Emap::GetHideItemName() const {
    return false;
}

bool Emap::GetSmallItemSize() const {
    return false;
}

std::string LoadEmapImgBase64String(const std::string&, int& length) {
    length = 0;
    return {};
}

int Camera::LoadByIdOnRecServer(int, int) {
    return kNotFound;
}

int IOModule::Load(int) {
    return kNotFound;
}

int IOModule::LoadByIdOnRecServer(int, int) {
    return kNotFound;
}

int IOModule::GetId() const {
    return m_Id;
}

std::string IOModule::GetName() const {
    return m_Name;
}

int POS::Load(int) {
    return kNotFound;
}

int POS::LoadByIdOnRecServer(int, int) {
    return kNotFound;
}

int POS::GetPairedCamIdOnRec() const {
    return m_PairedCamIdOnRec;
}

std::map<int, CamDetSetting> GetCamDetMap(const std::string&) {
    return {};
}

std::map<int, CamDeviceOutput> GetCamDOMap(const std::string&) {
    return {};
}

std::map<int, IOModuleSetting> GetIOModuleSettingMap(const std::string&) {
    return {};
}

int GetCamIdOnHost(int, int) {
    return kNoDevice;
}

int GetIOModuleIdOnHost(int, int) {
    return kNoDevice;
}

void GetPairedCam(int, int, int& camId, int& camServerId, int& camIdOnServer) {
    camId = camServerId = camIdOnServer = kNoDevice;
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

SlaveHxMgr::SlaveHxMgr(bool) {}

std::map<int, SlaveHx> SlaveHxMgr::GetSlaveHxMap(bool, bool, bool) const {
    return m_Servers;
}

std::set<int> PrivProfile::GetInaEmapIdSet(ITEM_PRIV_TYPE, bool) const {
    return {};
}

std::set<int> PrivProfile::GetInaIOIdSet(bool) const {
    return {};
}

bool IsDoorPrivAllowed(const PrivProfile&, DOOR_PRIV_TYPE, int) {
    return false;
}
