// SPDX-License-Identifier: Apache-2.0
//
// The command line's view of e-maps, what is placed on them, who may see it, and other hosts.
#include <fstream>

#include "standalone/store/devices.h"
#include "standalone/store/servers.h"
#include "test/component/cli/program.h"

namespace lookhaven::cli {
namespace {

class EmapsTest : public DemoTest {
  protected:
    std::string File(const std::string& name, const std::string& contents) {
        std::ofstream(folder_ / name) << contents;
        return (folder_ / name).string();
    }
};

TEST_F(EmapsTest, MapsAreMadeFilledCarriedOverAndRemoved) {
    const std::string plan = File("plan", "<svg width='4' height='3'/>");
    const std::string out = (folder_ / "map.json").string();
    Play({{"emap list", 0, "Ground floor"},
          {"emap add Yard " + plan + " --hide-names", 0, "id 3"},
          {"emap add Yard " + plan, 65, "already an e-map"},
          {"emap add Bad " + File("text", "hello"), 65, "PNG, JPEG, WebP or SVG"},
          {"emap add Bad /no/such", 66, "/no/such"},
          {"emap list", 0, "Yard", "Bad"},
          {"emap set 3 --small-items --name Court --json", 0, "\"hideItemName\" : true"},
          {"emap set 3 --large-items", 0, "Changed"},
          {"emap set 9 --name x", 66, "no e-map 9"},
          {"emap item add 3 camera 4 --name Gate --x 1 --y 2 --direction 90", 0, "item 1"},
          {"emap item add 3 emap 1", 0, "item 2"},
          {"emap item add 3 camera 99", 66, "no camera 99"},
          {"emap item add 3 door 1 --direction 360", 65, "0 to 359"},
          {"emap item add 3 lift 1", 64, "type"},
          {"emap item move 3 1 --x 7 --json", 0, "\"x\" : 7"},
          {"emap item move 3 9 --x 7", 66, "no item 9"},
          {"emap show 3", 0, "Gate"},
          {"emap export 3 " + out, 0, "map.json"},
          {"emap import " + out, 65, "already an e-map"},
          {"emap item remove 3 2", 0, "Removed item 2"},
          {"emap remove 3", 0, "Removed"},
          {"camera remove 4", 0, "Removed"},
          {"emap import " + out + " --name Again", 0, "1 items were left out"},
          {"emap show 4", 0, "emap", "camera"},
          {"emap import " + File("broken", "{\"lookhaven_emap\":1,"), 65, "not an e-map"},
          {"emap import " + File("deep", std::string(100'000, '[')), 65, "not an e-map"},
          {"emap remove 3", 66, "no e-map 3"}});
}

TEST_F(EmapsTest, DevicesAreKnownReportedAndDenied) {
    Play({{"door add Shed --camera 1", 0, "id 3"},
          {"door add Shed --camera 99", 66, "no camera 99"},
          {"door report 3 open", 0, "as open"},
          {"door report 3 ajar", 65, "open, closed or locked"},
          {"io add Box --port 0:in:1 --port 5:out", 0, "id 2"},
          {"io add Box --port 0:inn", 64, "0:in"},
          {"io add Box --port 0:in --port 0:out", 64, "0:in"},
          {"io list", 0, "0:in:1 5:out"},
          {"io report 2 on --port 5", 0, "as on"},
          {"io report 2 on --port 6", 66, "no port 6"},
          {"pos add Till2 --server 7 --id-on-server 1", 66, "no paired host 7"},
          {"pos set 1 --name Desk --json", 0, "\"Desk\""},
          {"camera ports 2 --inputs 2 --outputs 65", 65, "0 to 64"},
          {"user deny viewer --emap 2", 0, "e-map 2 is denied"},
          {"user deny viewer --io 1 --door 1", 64, "name one"},
          {"user deny viewer --io 1 --kind live", 64, "--kind"},
          {"user list", 0, "e-map 2; door 2"},
          {"user allow viewer --door 2", 0, "allowed"},
          {"user list", 0, "e-map 2", "door 2"},
          {"door remove 3", 0, "Removed"},
          {"door remove 3", 66, "no door 3"}});
    store::Store store = Open();
    EXPECT_TRUE(store::Devices(store).Find(store::EmapItemType::kIoModule, 2)->ports.contains(5));
}

TEST_F(EmapsTest, AHostIsNotRemovedWithItsDenialsUnseen) {
    store::Store store = Open();
    store::RecordingServers servers(store);
    store::RecordingServer annex{.name = "Annex", .address = "127.0.0.1", .port = 1};
    annex.certificate = "-----BEGIN CERTIFICATE-----\n-----END CERTIFICATE-----\n";
    servers.Pair(annex, std::string(64, 'a'), {{.id_on_server = 1, .name = "Yard"}});
    const std::string camera = std::to_string(servers.FindCamera(1, 1)->id);
    Play({{"server refresh", 69, "Annex failed: there is no certificate"},
          {"server set 1 --port 2 --address cam..example", 65, "host name or address"},
          {"server set 1 --name Shed --port 2 --json", 0, "\"answers\" : false"},
          {"server list", 0, "127.0.0.1  2"},
          {"server set 1 --name Annex --disable", 0, "Changed", "answer"},
          {"server pair x --address http://nvr/", 65, "neither a host name"},
          {"io add Shed --server 1 --id-on-server 4", 0, "id 2"},
          {"user deny viewer " + camera, 0, "denied"},
          {"user deny viewer --io 2", 0, "denied"},
          {"server remove 1", 65, "viewer: camera " + camera + ", I/O module 2"},
          {"user list", 0, camera},
          {"server remove 1 --yes", 0, "denied of it: viewer: camera " + camera + ", I/O module 2"},
          {"server list --json", 0, "[]"}});
}

TEST_F(EmapsTest, AnotherHostIsTakenInByItsLineAlone) {
    Play({{"server pair Watcher", 66, "certificate.pem"},
          {"server add Owner", 65, "server pair"},
          {"server add Owner", 65, "server pair", "", "lookhaven-pair-1:%%%\n"},
          {"server add Owner", 65, "server pair", "", "lookhaven-pair-1:W10=\n"},
          {"server add Owner", 65, "no certificate", "", "lookhaven-pair-1:e30=\n"},
          {"server invite Watcher", 66, "certificate.pem"},
          {"server add Owner --address 127.0.0.1", 65, "typing error", "", "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93M\n"},
          {"server add Owner", 64, "--address", "", "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93N\n"},
          {"server add Owner --address 127.0.0.1 --port 1", 69, "no host", "",
           "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93N\n"},
          {"server list --json", 0, "[]"},
          {"server remove 1", 66, "no paired host 1"},
          {"setting set cms on", 0, "shows the cameras of paired hosts"},
          {"setting set cms maybe", 64, "value"}});
}

}  // namespace
}  // namespace lookhaven::cli
