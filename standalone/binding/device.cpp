// SPDX-License-Identifier: Apache-2.0
//
// Devices on e-maps beside cameras, and the ids that this host gives to those of paired hosts.
#include "platform/emap/device.h"

#include "platform/privilege/privprofile.h"
#include "standalone/binding/camera_record.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/devices.h"
#include "standalone/store/servers.h"

namespace store = lookhaven::store;
using lookhaven::binding::IdSet;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;
using store::EmapItemType;

namespace {

constexpr int kNotFound = -1;
constexpr int kNoDevice = 0;

store::Devices Devices() {
    return store::Devices(RequestContext::Current().Records());
}

store::RecordingServers Servers() {
    return store::RecordingServers(RequestContext::Current().Records());
}

// A camera's id on the server, 0 for this host; 0 when it is another's.
int IdOnServer(int camera_id, int server_id) {
    if (server_id == 0 || camera_id == 0) {
        return camera_id;
    }
    const auto remote = Servers().FindCamera(camera_id);
    return remote && remote->server_id == server_id ? remote->id_on_server : 0;
}

// The camera that watches a device, as far as the caller may know it: 0 for one that is denied.
int Watching(int camera_id) {
    return camera_id != 0 && lookhaven::binding::MayUse(camera_id, store::CameraAccess::kLive) ? camera_id : kNoDevice;
}

std::map<int, store::PortCounts> PortsOf(const std::string& ids) {
    return OrFailure("camera ports", std::map<int, store::PortCounts>(), [&] {
        const std::set<int> wanted = IdSet(ids);
        auto ports = wanted.empty() ? std::map<int, store::PortCounts>() : Devices().CameraPorts();
        std::erase_if(ports, [&](const auto& entry) { return !wanted.contains(entry.first); });
        return ports;
    });
}

}  // namespace

int IOModule::Load(int moduleId) {
    return LoadByIdOnRecServer(moduleId, 0);
}

int IOModule::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return OrFailure("IOModule::Load", kNotFound, [&] {
        const auto found = Devices().FindOnServer(EmapItemType::kIoModule, serverId, idOnServer);
        if (!found) {
            return kNotFound;
        }
        m_Id = found->id;
        m_Name = found->name;
        return 0;
    });
}

int IOModule::GetId() const {
    return m_Id;
}

std::string IOModule::GetName() const {
    return m_Name;
}

int POS::Load(int posId) {
    return LoadByIdOnRecServer(posId, 0);
}

int POS::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return OrFailure("POS::Load", kNotFound, [&] {
        const auto found = Devices().FindOnServer(EmapItemType::kPos, serverId, idOnServer);
        if (!found) {
            return kNotFound;
        }
        m_PairedCamIdOnRec = IdOnServer(Watching(found->camera_id), serverId);
        return 0;
    });
}

int POS::GetPairedCamIdOnRec() const {
    return m_PairedCamIdOnRec;
}

std::map<int, CamDetSetting> GetCamDetMap(const std::string& ids) {
    std::map<int, CamDetSetting> inputs;
    for (const auto& [camera, ports] : PortsOf(ids)) {
        inputs.emplace(camera, ports.inputs);
    }
    return inputs;
}

std::map<int, CamDeviceOutput> GetCamDOMap(const std::string& ids) {
    std::map<int, CamDeviceOutput> outputs;
    for (const auto& [camera, ports] : PortsOf(ids)) {
        outputs.emplace(camera, ports.outputs);
    }
    return outputs;
}

std::map<int, IOModuleSetting> GetIOModuleSettingMap(const std::string& ids) {
    return OrFailure("GetIOModuleSettingMap", std::map<int, IOModuleSetting>(), [&] {
        std::map<int, IOModuleSetting> settings;
        for (const int id : IdSet(ids)) {
            std::map<int, int> types;
            for (const auto& [index, port] :
                 Devices().Find(EmapItemType::kIoModule, id).value_or(store::Device()).ports) {
                types[index] = static_cast<int>(port.type);
            }
            settings.emplace(id, types);
        }
        return settings;
    });
}

int GetCamIdOnHost(int serverId, int idOnServer) {
    return OrFailure("GetCamIdOnHost", kNoDevice,
                     [&] { return Servers().FindCamera(serverId, idOnServer).value_or(store::RemoteCamera()).id; });
}

int GetIOModuleIdOnHost(int serverId, int idOnServer) {
    return OrFailure("GetIOModuleIdOnHost", kNoDevice, [&] {
        return Devices().FindOnServer(EmapItemType::kIoModule, serverId, idOnServer).value_or(store::Device()).id;
    });
}

void GetPairedCam(int moduleId, int portIdx, int& camId, int& camServerId, int& camIdOnServer) {
    camId = camServerId = camIdOnServer = kNoDevice;
    OrFailure("GetPairedCam", 0, [&] {
        const auto module = Devices().Find(EmapItemType::kIoModule, moduleId).value_or(store::Device());
        const auto port = module.ports.find(portIdx);
        const int camera = port == module.ports.end() ? kNoDevice : Watching(port->second.camera_id);
        if (camera == kNoDevice) {
            return 0;
        }
        const auto remote = Servers().FindCamera(camera);
        camServerId = remote ? remote->server_id : 0;
        camIdOnServer = remote ? remote->id_on_server : camera;
        camId = camera;
        return 0;
    });
}
