// SPDX-License-Identifier: Apache-2.0
//
// The items of an e-map as a client gets them: completed from their devices' records, without those that the user may
// not access, ordered by kind and device.
#pragma once

#include <map>
#include <string>

#include <json/json.h>

#include "platform/admission/slavehx.h"
#include "platform/emap/device.h"
#include "platform/emap/emap.h"
#include "platform/privilege/privprofile.h"

class EmapItems {
  public:
    // profile: decides which doors are shown. servers: the recording servers of a managing host, by id.
    EmapItems(PrivProfile profile, std::map<int, SlaveHx> servers)
        : m_Profile(std::move(profile)),
          m_Servers(std::move(servers)) {}

    // Adds all items. An item whose device cannot be loaded is skipped after a log line.
    void Add(const Emap& emap);
    // Removes the cameras, links and I/O modules that the user may not access. A paired host admitted by pair
    // matching gets all.
    void Filter(unsigned int uid);
    // Cameras, links, doors, I/O modules, POS terminals; each kind by ascending id, the items of a device in e-map
    // order.
    Json::Value List() const;

  private:
    void LoadPorts(const Emap& emap);
    void AddItem(const __tag_EMAP_ITEM_INFO& item);
    Json::Value Describe(const __tag_EMAP_ITEM_INFO& item) const;
    void AddCamera(const __tag_EMAP_ITEM_INFO& item);
    void AddIOModule(const __tag_EMAP_ITEM_INFO& item);
    void AddPos(const __tag_EMAP_ITEM_INFO& item);

    PrivProfile m_Profile;
    std::map<int, SlaveHx> m_Servers;
    std::map<int, CamDetSetting> m_Inputs;
    std::map<int, CamDeviceOutput> m_Outputs;
    std::map<int, IOModuleSetting> m_IOSettings;
    // By device id: an array of items, or the single item of a link or door.
    std::map<int, Json::Value> m_Cameras, m_Links, m_Doors, m_IOModules, m_Pos;
};
