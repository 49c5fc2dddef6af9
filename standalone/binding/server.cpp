// SPDX-License-Identifier: Apache-2.0
//
// The paired hosts whose cameras this one shows, and how paired hosts know each other.
#include "platform/admission/host.h"
#include "platform/admission/pairauth.h"
#include "platform/admission/slavehx.h"
#include "platform/camera/camera.h"
#include "platform/privilege/privprofile.h"
#include "standalone/base/clock.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/remote/pair_token.h"
#include "standalone/store/servers.h"
#include "standalone/store/settings.h"

namespace remote = lookhaven::remote;
namespace store = lookhaven::store;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

namespace {

constexpr int kNotFound = -1;

std::int64_t UtcSeconds() {
    return lookhaven::base::WallMillis() / 1'000;
}

store::RecordingServers Servers() {
    return store::RecordingServers(RequestContext::Current().Records());
}

}  // namespace

bool IsCmsHost() {
    return OrFailure("IsCmsHost", false,
                     [] { return store::Settings(RequestContext::Current().Records()).Find("cms") == "on"; });
}

int GetCamOwnerHxId(int camId) {
    return OrFailure("GetCamOwnerHxId", 0,
                     [&] { return Servers().FindCamera(camId).value_or(store::RemoteCamera()).server_id; });
}

int Camera::LoadByIdOnRecServer(int idOnServer, int serverId) {
    return OrFailure("Camera::LoadByIdOnRecServer", kNotFound, [&] {
        const auto found = Servers().FindCamera(serverId, idOnServer);
        if (!found) {
            return kNotFound;
        }
        *this = Camera();
        m_Id = found->id;
        found->name.copy(m_szName, sizeof m_szName - 1);
        m_blEnabled = true;
        m_VideoType = static_cast<int>(found->video_type);
        m_AudioType = found->audio ? CAM_AUDIO_SUPPORTED : CAM_AUDIO_NONE;
        m_OwnerDevName = Servers().Find(serverId).value_or(store::RecordingServer()).name;
        return 0;
    });
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

// The cookie is "<timestamp>-<token>": a client that asks the paired host itself sends the two apart. While it is valid
// it opens all of that host's cameras, so only managers of this host get one; other callers use the relay.
SlaveHxMgr::SlaveHxMgr(bool load) {
    if (!load) {
        return;
    }
    OrFailure("SlaveHxMgr", 0, [&] {
        const std::string timestamp = std::to_string(UtcSeconds());
        const bool may_have_token = lookhaven::binding::IsManager();
        for (const store::RecordingServer& server : Servers().List()) {
            if (!server.address.empty()) {
                const std::string secret = may_have_token ? Servers().FindSecret(server.id) : "";
                const std::string cookie =
                    secret.empty() ? "" : timestamp + "-" + remote::MakePairToken(secret, timestamp);
                m_Servers.emplace(server.id, SlaveHx(server.address, server.port, cookie));
            }
        }
        return 0;
    });
}

// This host does not monitor its paired hosts: an enabled one is reported as online, and as of this host's version.
std::map<int, SlaveHx> SlaveHxMgr::GetSlaveHxMap(bool onlyOnline, bool onlyEnabled, bool onlySameVersion) const {
    std::map<int, SlaveHx> servers = m_Servers;
    if (onlyOnline || onlyEnabled || onlySameVersion) {
        std::erase_if(servers, [](const auto& entry) {
            return OrFailure("GetSlaveHxMap", true, [&] { return Servers().FindSecret(entry.first).empty(); });
        });
    }
    return servers;
}

// A caller with a valid pair token is the paired host from here on, whatever session came along.
bool IsAuthPairMatch(const std::string& cookie, const std::string& timestamp) {
    const std::string shared = OrFailure("IsAuthPairMatch", std::string(), [&] {
        const std::int64_t now = UtcSeconds();
        std::string found;
        for (const std::string& secret : Servers().InboundPeerSecrets()) {
            if (remote::PairTokenMatches(cookie, timestamp, secret, now)) {
                found = secret;
            }
        }
        if (!found.empty()) {
            RequestContext::Current().SetCaller(PAIR_AUTH_UID);
        }
        return found;
    });
    if (!shared.empty()) {
        RequestContext::Current().NotePairedHost(shared);
    }
    return !shared.empty();
}

SlaveHxAuthentication::SlaveHxAuthentication() = default;

bool SlaveHxAuthentication::IsAuthByPairMatch(const std::string& cookie, const std::string& timestamp) {
    return IsAuthPairMatch(cookie, timestamp);
}
