// SPDX-License-Identifier: Apache-2.0
//
// What stands on e-maps beside cameras and links: doors, I/O modules, POS terminals, and cameras' inputs and outputs.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "standalone/store/emaps.h"

namespace lookhaven::store {

// The numbers are stored, and go to clients.
enum class PortType : int { kOutput = 1, kInput = 3 };

struct Port {
    PortType type = PortType::kInput;
    int camera_id = 0;  // that watches what the port belongs to, by its id on this host; 0: none

    friend bool operator==(const Port&, const Port&) = default;
};

constexpr int kMaxPorts = 64;

// A door, an I/O module or a POS terminal. Doors are always this host's own.
struct Device {
    EmapItemType kind = EmapItemType::kDoor;
    int id = 0;                      // from 1, never used twice within its kind
    std::string name = {};           // UTF-8, 1 to 64 bytes
    int server_id = 0;               // the paired host that owns it; 0: this host
    int id_on_server = 0;            // its id there; the same as id for this host's own
    int camera_id = 0;               // that watches a door or POS terminal, by its id on this host; 0: none
    std::map<int, Port> ports = {};  // of an I/O module, by index from 0
};

// "door", "I/O module", "POS terminal" in sentences. Throws InvalidRecord for another type of item.
std::string DeviceKindText(EmapItemType kind);

// A device's inputs come first, its outputs after them.
struct PortCounts {
    int inputs = 0;
    int outputs = 0;
};

// As an integration last reported it.
struct DeviceState {
    EmapItemType kind = EmapItemType::kDoor;
    int id = 0;
    int port = -1;      // -1 for a door
    std::string state;  // "open", "closed" or "locked" of a door; "on" or "off" of a port
    std::int64_t since_s = 0;
};

// Invariants    Every change but that of a state raises Settings::Revision() in the same transaction.
class Devices {
  public:
    // The store must outlive this object.
    explicit Devices(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id of its kind, which it returns. Throws InvalidRecord; NotFound for an unknown
    // host or paired camera; AlreadyExists when the host's device has an id here.
    int Add(const Device& device);
    // Replaces name, paired camera and ports of the device. Throws InvalidRecord, or NotFound for an unknown device, or
    // a camera that is neither known nor paired with the device already.
    void Update(const Device& device);
    // Its items stay on their maps, hidden, except a door's, which is shown without a state. Throws NotFound.
    void Remove(EmapItemType kind, int id);

    std::optional<Device> Find(EmapItemType kind, int id);
    std::optional<Device> FindOnServer(EmapItemType kind, int server_id, int id_on_server);
    std::vector<Device> List(EmapItemType kind);  // by id

    // For a camera of this host or of a paired one. Throws NotFound or InvalidRecord.
    void SetCameraPorts(int camera_id, PortCounts counts);
    std::map<int, PortCounts> CameraPorts();  // by camera, only those that have any

    // Throws NotFound for an unknown device or port, InvalidRecord for a state that its kind does not have. A power cut
    // may lose a report that has returned.
    void Report(const DeviceState& state);
    std::vector<DeviceState> States();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
