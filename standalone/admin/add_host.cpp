// SPDX-License-Identifier: Apache-2.0
//
// Adds this machine to the hosts of its store. Apart from hosts.cpp: the web API's host links nothing that reads
// certificates.
#include "standalone/admin/certificate_folder.h"
#include "standalone/admin/change.h"
#include "standalone/admin/hosts.h"
#include "standalone/base/version.h"
#include "standalone/remote/certificate.h"

namespace lookhaven::admin {

store::Host AddHost(store::Store& store, const Actor& actor, const base::Installation& installation,
                    const HostPlace& place) {
    if (store.IsSqlite()) {
        throw store::InvalidRecord("hosts share a store in PostgreSQL, and this one is a SQLite file, which one machine"
                                   " alone can use: move it there first, with lookhaven store move");
    }
    const std::string certificate = remote::CertificatesIn(CertificateFolder::Certificates(installation));
    const int known_id = installation.HostId();
    store::Host host;
    try {
        Apply(store, actor, [&] {
            store::Hosts hosts(store);
            const std::optional<store::Host> known = hosts.Find(known_id);
            if (known && known->name != place.name) {
                throw store::InvalidRecord(
                    "this machine is host " + known->name +
                    " already; on a copy of that host's state folder, remove the file host first");
            }
            host = known.value_or(store::Host());
            host.name = place.name;
            host.address = place.address;
            host.port = place.port;
            host.certificate = certificate;
            host.version = base::kVersion;
            if (known) {
                hosts.Update(host);
            } else {
                if (place.name == kAnyHost) {
                    throw store::InvalidRecord("\"any\" stands for every host, and is no host's name");
                }
                host.id = hosts.Add(host);
                installation.SetHostId(host.id);  // an id that is in no store makes nobody a host
            }
            return Change{known ? "host.set" : "host.add", Named(host.name, host.id),
                          known ? HostRecord(*known) : Json::Value(), HostRecord(host)};
        });
    } catch (...) {
        installation.SetHostId(known_id);
        throw;
    }
    return host;
}

}  // namespace lookhaven::admin
