// SPDX-License-Identifier: Apache-2.0
//
// The items of an e-map as a client gets them: with what their devices' records tell, without those that the user may not
// see, ordered by kind and device.
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
    // profile: decides about doors. servers: the recording servers of a managing host, by id.
    EmapItems(PrivProfile profile, std::map<int, SlaveHx> servers)
        : m_Profile(std::move(profile)),
          m_Servers(std::move(servers)) {}

    // Takes all items. A device that cannot be loaded costs its item and a log line.
    void Add(const Emap& emap);
    // Drops the cameras, links and I/O modules that the user may not see. A peer admitted by pair matching sees all.
    void Filter(unsigned int uid);
    // Cameras, links, doors, I/O modules, tills; each kind by ascending id, the items of one device in e-map order.
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
    // By device id: an array of items, for links and doors the one item.
    std::map<int, Json::Value> m_Cameras, m_Links, m_Doors, m_IOModules, m_Pos;
};
