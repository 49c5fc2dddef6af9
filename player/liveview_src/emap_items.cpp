// SPDX-License-Identifier: Apache-2.0
//
// Describes, filters and orders the items of an e-map.
#include "player/liveview_src/emap_items.h"

#include <set>

#include "platform/camera/camera.h"
#include "player/iter2string.h"
#include "player/liveview_src/live_loop.h"
#include "webapi/include/diaglog.h"

namespace {

// The function that the log lines name.
constexpr char kFunc[] = "LiveviewEmap";

enum PortType { kPortNone = 0, kPortOutput = 1, kPortInput = 3 };

template <typename Device>
int LoadDevice(Device& device, const __tag_EMAP_ITEM_INFO& item) {
    return item.m_HxId == 0 ? device.Load(item.m_Id) : device.LoadByIdOnRecServer(item.m_Id, item.m_HxId);
}

std::string Join(const std::set<int>& ids) {
    return Iter2String(ids.begin(), ids.end(), ",");
}

// The record of the id; a default-constructed one if the map has none.
template <typename Record>
Record Find(const std::map<int, Record>& records, int id) {
    const auto found = records.find(id);
    return found == records.end() ? Record() : found->second;
}

void RemoveSetKeyFromMap(const std::set<int>& keys, std::map<int, Json::Value>& items) {
    std::erase_if(items, [&](const auto& entry) { return keys.count(entry.first) != 0; });
}

}  // namespace

void EmapItems::Add(const Emap& emap) {
    LoadPorts(emap);
    const int count = emap.GetItemNum();
    for (int index = 0; index < count; ++index) {
        __tag_EMAP_ITEM_INFO item;
        if (emap.GetItem(index, item) == 0) {
            AddItem(item);
        }
    }
}

void EmapItems::LoadPorts(const Emap& emap) {
    std::set<int> cameras;
    std::set<int> modules;
    for (int index = 0; index < emap.GetItemNum(); ++index) {
        __tag_EMAP_ITEM_INFO item;
        if (emap.GetItem(index, item) != 0) {
            continue;
        }
        if (item.m_Type == EMAP_ITEM_CAMERA) {
            cameras.insert(item.m_HxId == 0 ? item.m_Id : GetCamIdOnHost(item.m_HxId, item.m_Id));
        } else if (item.m_Type == EMAP_ITEM_IO_MODULE) {
            modules.insert(item.m_HxId == 0 ? item.m_Id : GetIOModuleIdOnHost(item.m_HxId, item.m_Id));
        }
    }
    m_Inputs = GetCamDetMap(Join(cameras));
    m_Outputs = GetCamDOMap(Join(cameras));
    m_IOSettings = GetIOModuleSettingMap(Join(modules));
}

void EmapItems::AddItem(const __tag_EMAP_ITEM_INFO& item) {
    switch (item.m_Type) {
    case EMAP_ITEM_CAMERA:
        return AddCamera(item);
    case EMAP_ITEM_EMAP:
        m_Links[item.m_Id] = Describe(item);
        return;
    case EMAP_ITEM_DOOR:
        if (IsDoorPrivAllowed(m_Profile, DOOR_PRIV_VIEW, item.m_Id)) {
            m_Doors[item.m_Id] = Describe(item);
        }
        return;
    case EMAP_ITEM_IO_MODULE:
        return AddIOModule(item);
    case EMAP_ITEM_POS:
        return AddPos(item);
    }
}

Json::Value EmapItems::Describe(const __tag_EMAP_ITEM_INFO& item) const {
    Json::Value description;
    description["type"] = std::to_string(item.m_Type);
    description["id"] = std::to_string(item.m_Id);
    description["name"] = item.m_Name;
    description["hxId"] = std::to_string(item.m_HxId);
    const auto server = m_Servers.find(item.m_HxId);
    if (server != m_Servers.end()) {
        description["hxIP"] = server->second.GetIP();
        description["hxCookie"] = server->second.GetCookie();
        description["hxPort"] = std::to_string(server->second.GetPort());
    } else {
        description["hxIP"] = "";
        description["hxCookie"] = "";
        // A number here, a text for a known server: clients tell the two apart by the type.
        description["hxPort"] = 0;
    }
    description["x"] = std::to_string(item.m_X);
    description["y"] = std::to_string(item.m_Y);
    description["textPos"] = std::to_string(item.m_TextPos);
    description["direction"] = std::to_string(item.m_Direction);
    description["iconCenterX"] = item.m_IconCenterX;
    description["iconCenterY"] = item.m_IconCenterY;
    return description;
}

void EmapItems::AddCamera(const __tag_EMAP_ITEM_INFO& item) {
    Camera camera;
    const int failed =
        item.m_HxId == 0 ? camera.Load(item.m_Id, 0, 0) : camera.LoadByIdOnRecServer(item.m_Id, item.m_HxId);
    if (failed != 0) {
        LH_LOG_AT(kLiveviewSource, __LINE__, kFunc, "Failed to load camera [camid:%d][hxid:%d]\n", item.m_Id,
                  item.m_HxId);
        return;
    }
    const std::int64_t inputs = Find(m_Inputs, camera.m_Id).GetDICnt();
    const std::int64_t ports = inputs + Find(m_Outputs, camera.m_Id).GetDoCnt();
    const int port = item.m_PortIdx;
    Json::Value description = Describe(item);
    description["VideoType"] = camera.m_VideoType;
    description["AudioType"] = camera.m_AudioType;
    description["deviceType"] = camera.m_DeviceType;
    description["ownerDevName"] = camera.m_OwnerDevName;
    description["portIdx"] = port;
    description["portType"] = port >= 0 && port < inputs       ? kPortInput
                              : port >= inputs && port < ports ? kPortOutput
                                                               : kPortNone;
    m_Cameras[camera.m_Id].append(description);
}

void EmapItems::AddIOModule(const __tag_EMAP_ITEM_INFO& item) {
    IOModule module;
    if (LoadDevice(module, item) != 0) {
        LH_LOG_AT(kLiveviewSource, __LINE__, kFunc, "Failed to load iomodule [id:%d][hxid:%d]\n", item.m_Id,
                  item.m_HxId);
        return;
    }
    int camId = 0;
    int camServerId = 0;
    int camIdOnServer = 0;
    GetPairedCam(module.GetId(), item.m_PortIdx, camId, camServerId, camIdOnServer);
    std::map<int, int> types;
    Find(m_IOSettings, module.GetId()).GetType(types);
    Json::Value description = Describe(item);
    description["pairedCamHxId"] = camServerId;
    description["pairedCamId"] = camId;
    description["pairedCamIdOnRec"] = camIdOnServer;
    description["ownerDevName"] = module.GetName();
    description["portIdx"] = item.m_PortIdx;
    description["portType"] = Find(types, item.m_PortIdx);
    m_IOModules[module.GetId()].append(description);
}

void EmapItems::AddPos(const __tag_EMAP_ITEM_INFO& item) {
    POS pos;
    if (LoadDevice(pos, item) != 0) {
        LH_LOG_AT(kLiveviewSource, __LINE__, kFunc, "Failed to load POS [id:%d][hxid:%d]\n", item.m_Id, item.m_HxId);
        return;
    }
    Json::Value description = Describe(item);
    description["pairedCamHxId"] = item.m_HxId;
    description["pairedCamIdOnRec"] = pos.GetPairedCamIdOnRec();
    m_Pos[item.m_Id].append(description);
}

void EmapItems::Filter(unsigned int uid) {
    if (uid == PAIR_AUTH_UID || (m_Cameras.empty() && m_Links.empty() && m_IOModules.empty())) {
        return;
    }
    const PrivProfile profile = PrivProfileGetByUid(uid);
    RemoveSetKeyFromMap(profile.GetInaCamIdSet(CAM_PRIV_LIVEVIEW, true), m_Cameras);
    RemoveSetKeyFromMap(profile.GetInaEmapIdSet(ITEM_PRIV_VIEW, false), m_Links);
    RemoveSetKeyFromMap(profile.GetInaIOIdSet(false), m_IOModules);
}

Json::Value EmapItems::List() const {
    Json::Value list(Json::arrayValue);
    for (const auto* kind : {&m_Cameras, &m_Links, &m_Doors, &m_IOModules, &m_Pos}) {
        for (const auto& [id, items] : *kind) {
            if (items.isObject()) {
                list.append(items);
                continue;
            }
            for (const Json::Value& item : items) {
                list.append(item);
            }
        }
    }
    return list;
}
