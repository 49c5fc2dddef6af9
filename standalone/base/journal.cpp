// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/journal.h"

#include <cstring>
#include <string>

#include <sys/socket.h>
#include <sys/un.h>

#include "standalone/base/concat.h"
#include "standalone/base/file_descriptor.h"

namespace lookhaven::base {

namespace {

std::string DatagramOf(const JournalEntry& entry) {
    std::string datagram = Concat("MESSAGE=", entry.text, "\nPRIORITY=", entry.priority,
                                  "\nSYSLOG_IDENTIFIER=lookhaven-", entry.program, '\n');
    if (entry.camera != 0) {
        datagram += Concat("LOOKHAVEN_CAMERA=", entry.camera, '\n');
    }
    if (!entry.account.empty()) {
        datagram += Concat("LOOKHAVEN_ACCOUNT=", entry.account, '\n');
    }
    return datagram;
}

}  // namespace

bool SendToJournal(const JournalEntry& entry, const char* socket) {
    const std::string datagram = DatagramOf(entry);
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    std::strncpy(address.sun_path, socket, sizeof address.sun_path - 1);
    const FileDescriptor sender(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    return sender && ::sendto(sender.Get(), datagram.data(), datagram.size(), MSG_DONTWAIT | MSG_NOSIGNAL,
                              reinterpret_cast<const sockaddr*>(&address),
                              sizeof address) == static_cast<ssize_t>(datagram.size());
}

}  // namespace lookhaven::base
