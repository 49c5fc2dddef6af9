// SPDX-License-Identifier: Apache-2.0
//
// E-maps: floor plans and what is placed on them. Their pictures: emap/pictures.h.
#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// The numbers are stored, and go to clients.
enum class EmapItemType : int { kCamera = 0, kEmap = 1, kDoor = 2, kIoModule = 3, kPos = 4 };

struct EmapItem {
    EmapItemType type = EmapItemType::kCamera;
    int device_id = 0;      // on the device's own host
    std::string name = {};  // UTF-8, up to 255 bytes
    int server_id = 0;      // the paired host that owns the device; 0: this host
    int x = 0;              // pixels of the picture, as y
    int y = 0;
    int direction = 0;      // degrees clockwise from up, 0 to 359
    int text_pos = 0;       // of the name: 0 below, 1 above, 2 left, 3 right
    int icon_center_x = 0;  // pixels from the icon's middle to the point that lies on x, y
    int icon_center_y = 0;
    int port = -1;  // of the device's inputs and outputs; -1: the device as a whole

    friend bool operator==(const EmapItem&, const EmapItem&) = default;
};

struct Emap {
    int id = 0;              // from 1, never used twice
    std::string name = {};   // UTF-8, 1 to 64 bytes, no other map's
    std::string image = {};  // the picture's file name; empty until there is one
    bool hide_names = false;
    bool small_items = false;
    int revision = 1;  // grows with every change of the map or its items
};

struct EmapSummary : Emap {
    int item_count = 0;
};

constexpr int kMaxEmapItems = 1000;

// Invariants    Every change raises Settings::Revision() in the same transaction.
class Emaps {
  public:
    // The store must outlive this object.
    explicit Emaps(Store& store) : connection_(store.connection()) {}

    // Stores name and flags under a new id, which it returns. Throws InvalidRecord or AlreadyExists.
    int Add(const Emap& emap);
    // Replaces name and flags of emap.id. Throws as Add, and NotFound.
    void Update(const Emap& emap);
    // image: the name of a file that is there. Throws NotFound.
    void SetImage(int id, const std::string& image);
    // Removes the map with its items; links to it stay until their map is changed. Throws NotFound.
    void Remove(int id);

    std::optional<Emap> Find(int id);
    std::vector<EmapSummary> List();  // by id

    // In the order they were given.
    std::vector<EmapItem> Items(int id);
    // Which maps have a link to each map, by id; maps without one are missing.
    std::map<int, std::set<int>> Links();
    // Whether the item's device is known.
    bool Knows(const EmapItem& item);
    // Replaces all items and both flags of emap.id at once, and returns the new revision. Throws NotFound for an
    // unknown map, and for a device that is neither known nor on the map already; Conflict when the map's revision is
    // not emap.revision; InvalidRecord.
    int ReplaceItems(const Emap& emap, const std::vector<EmapItem>& items);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
