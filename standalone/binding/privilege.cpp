// SPDX-License-Identifier: Apache-2.0
//
// Privilege profiles: what a user may not see, read from the store and narrowed by what a relaying host sends along.
//
// Format        {"privilege": 2, "deniedCameras": [3, 7], "deniedAudio": [4]}; each may be missing. A denied camera is
//               denied for every kind of access.
#include <algorithm>
#include <initializer_list>
#include <map>
#include <stdexcept>

#include "platform/privilege/privprofile.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/users.h"

namespace store = lookhaven::store;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

static_assert(static_cast<int>(store::CameraAccess::kLive) == CAM_PRIV_LIVEVIEW);
static_assert(static_cast<int>(store::CameraAccess::kPlayback) == CAM_PRIV_PLAYBACK);
static_assert(static_cast<int>(store::CameraAccess::kAudio) == CAM_PRIV_AUDIO);
static_assert(store::kPairedHostUserId == PAIR_AUTH_UID);

namespace lookhaven::binding {

namespace {

// What the module asks profiles about.
constexpr std::initializer_list<store::CameraAccess> kProfileAccess = {
    store::CameraAccess::kLive, store::CameraAccess::kPlayback, store::CameraAccess::kAudio};

// A restriction that is not understood cannot be applied, so the request must fail rather than go on unrestricted.
void RequireKnownShape(const Json::Value& priv_data) {
    const std::set<std::string> known = {"privilege", "deniedCameras", "deniedAudio"};
    for (const std::string& member : priv_data.getMemberNames()) {  // throws for what is no object
        const bool fits = member == "privilege" ? priv_data[member].isInt() : priv_data[member].isArray();
        if (!known.contains(member) || !fits) {
            throw Json::LogicError("privData has a member that is not known or of the wrong type: " + member);
        }
    }
}

// The caller's account; nothing for one that was removed and for who has none.
const std::optional<store::User>& CallersAccount() {
    RequestContext& context = RequestContext::Current();
    std::optional<std::optional<store::User>>& known = context.Cache().caller;
    if (!known) {
        known = store::Users(context.Records()).Find(static_cast<int>(context.Caller()));
    }
    return *known;
}

// The cameras that the caller's account is denied.
const std::set<int>& DeniedToAccount(store::CameraAccess kind) {
    RequestContext& context = RequestContext::Current();
    std::map<store::CameraAccess, std::set<int>>& known = context.Cache().denied_cameras;
    const auto found = known.find(kind);
    return found != known.end()
               ? found->second
               : known[kind] = store::Users(context.Records()).DeniedCameras(static_cast<int>(context.Caller()), kind);
}

std::set<int> IdsUnder(const Json::Value& priv_data, const char* member) {
    std::set<int> cameras;
    for (const Json::Value& camera : priv_data[member]) {
        if (!camera.isInt()) {  // asInt would take null, true or 3.5 for some other camera
            throw Json::LogicError(std::string("privData names a camera by no number: ") + member);
        }
        cameras.insert(camera.asInt());
    }
    return cameras;
}

}  // namespace

void Restrictions::AddTo(std::set<int>& denied, store::CameraAccess kind) const {
    denied.insert(cameras.begin(), cameras.end());
    if (kind == store::CameraAccess::kAudio) {
        denied.insert(sound.begin(), sound.end());
    }
}

Restrictions RestrictionsOf(const Json::Value& priv_data) {
    if (priv_data.isNull()) {
        return {};
    }
    RequireKnownShape(priv_data);
    return {IdsUnder(priv_data, "deniedCameras"), IdsUnder(priv_data, "deniedAudio"),
            static_cast<store::Privilege>(std::max(0, priv_data.get("privilege", 0).asInt()))};
}

bool MayUse(int camera, store::CameraAccess kind) {
    RequestContext& context = RequestContext::Current();
    const unsigned int caller = context.Caller();
    if (caller == 0 || context.RequestRestrictions().IsDenied(camera, kind)) {
        return false;
    }
    if (caller == PAIR_AUTH_UID) {
        return true;
    }
    return CallersAccount() && !DeniedToAccount(kind).contains(camera);
}

bool MaySee(store::DeniableItem kind, int id) {
    RequestContext& context = RequestContext::Current();
    const unsigned int caller = context.Caller();
    if (caller == 0 || caller == PAIR_AUTH_UID) {
        return caller != 0;
    }
    return CallersAccount() &&
           !store::Users(context.Records()).DeniedItems(static_cast<int>(caller), kind).contains(id);
}

bool IsManager() {
    const std::optional<store::User>& user = CallersAccount();
    return user && user->IsManager() &&
           RequestContext::Current().RequestRestrictions().privilege <= store::Privilege::kManager;
}

std::set<int> DeniedCameras(store::CameraAccess kind) {
    RequestContext& context = RequestContext::Current();
    std::set<int> denied;
    context.RequestRestrictions().AddTo(denied, kind);
    if (context.Caller() != PAIR_AUTH_UID) {
        if (!CallersAccount()) {  // removed meanwhile: everything is denied, which no set can say
            throw std::runtime_error("the caller's account was removed");
        }
        denied.insert(DeniedToAccount(kind).begin(), DeniedToAccount(kind).end());
    }
    return denied;
}

}  // namespace lookhaven::binding

namespace {

// A user of this host: neither nobody nor a paired host.
bool IsUser(int profile_id) {
    return profile_id != 0 && profile_id != static_cast<int>(PAIR_AUTH_UID);
}

// Everything is denied to an unknown caller, which no set of ids can express: such a request fails.
void RequireSomebody(int profile_id) {
    if (profile_id == 0) {
        throw std::runtime_error("the rights of an account that is unknown were asked for");
    }
}

store::Users Users() {
    return store::Users(RequestContext::Current().Records());
}

}  // namespace

struct PrivProfile::Data {
    int id = 0;
    int privilege = static_cast<int>(store::Privilege::kViewer);
    std::map<int, std::set<int>> denied_cameras;  // by CAM_PRIV_TYPE

    void Restrict(const lookhaven::binding::Restrictions& restrictions) {
        privilege = std::max(privilege, static_cast<int>(restrictions.privilege));
        for (const store::CameraAccess kind : lookhaven::binding::kProfileAccess) {
            restrictions.AddTo(denied_cameras[static_cast<int>(kind)], kind);
        }
    }
};

PrivProfile::PrivProfile() : m_pData(std::make_shared<const Data>()) {}

PrivProfile::PrivProfile(std::shared_ptr<const Data> data) : m_pData(std::move(data)) {}

int PrivProfile::GetId() const {
    return m_pData->id;
}

int PrivProfile::GetPrivilege() const {
    return m_pData->privilege;
}

// No list hides a camera here, so withHidden adds none.
std::set<int> PrivProfile::GetInaCamIdSet(CAM_PRIV_TYPE type, bool) const {
    RequireSomebody(m_pData->id);
    const auto denied = m_pData->denied_cameras.find(type);
    return denied == m_pData->denied_cameras.end() ? std::set<int>{} : denied->second;
}

// Few requests ask for these, so they are read on demand; an exception of the store ends the request.
std::set<int> PrivProfile::GetInaPrivPerCamGrpIdSet(int type) const {
    return IsUser(m_pData->id) ? Users().DeniedGroups(m_pData->id, static_cast<store::CameraAccess>(type))
                               : std::set<int>{};
}

std::set<int> PrivProfile::GetInaEmapIdSet(ITEM_PRIV_TYPE, bool) const {
    RequireSomebody(m_pData->id);
    return IsUser(m_pData->id) ? Users().DeniedItems(m_pData->id, store::DeniableItem::kEmap) : std::set<int>{};
}

std::set<int> PrivProfile::GetInaIOIdSet(bool) const {
    RequireSomebody(m_pData->id);
    return IsUser(m_pData->id) ? Users().DeniedItems(m_pData->id, store::DeniableItem::kIoModule) : std::set<int>{};
}

bool IsDoorPrivAllowed(const PrivProfile& profile, DOOR_PRIV_TYPE, int doorId) {
    return IsUser(profile.GetId()) ? !Users().DeniedItems(profile.GetId(), store::DeniableItem::kDoor).contains(doorId)
                                   : profile.GetId() != 0;
}

void PrivProfile::UpdateByJson(const Json::Value& privData) {
    auto narrowed = std::make_shared<Data>(*m_pData);
    narrowed->Restrict(lookhaven::binding::RestrictionsOf(privData));
    m_pData = std::move(narrowed);
}

// Not every handler applies "privData", so the caller's profile comes with it applied.
PrivProfile PrivProfileGetByUid(unsigned int uid) {
    return OrFailure("PrivProfileGetByUid", PrivProfile(), [&] {
        auto data = std::make_shared<PrivProfile::Data>();
        if (uid == PAIR_AUTH_UID) {
            data->id = static_cast<int>(PAIR_AUTH_UID);
        } else {
            const bool is_caller = uid == RequestContext::Current().Caller();
            const auto user = is_caller ? lookhaven::binding::CallersAccount() : Users().Find(static_cast<int>(uid));
            if (!user) {
                return PrivProfile();
            }
            data->id = user->id;
            data->privilege = static_cast<int>(user->privilege);
            for (const store::CameraAccess kind : lookhaven::binding::kProfileAccess) {
                data->denied_cameras[static_cast<int>(kind)] =
                    is_caller ? lookhaven::binding::DeniedToAccount(kind) : Users().DeniedCameras(user->id, kind);
            }
        }
        if (uid == RequestContext::Current().Caller()) {
            data->Restrict(RequestContext::Current().RequestRestrictions());
        }
        return PrivProfile(data);
    });
}
