// SPDX-License-Identifier: Apache-2.0
#include "standalone/webapi/catalog.h"

#include "platform/camera/camgroup.h"
#include "platform/privilege/privprofile.h"
#include "standalone/binding/rights.h"
#include "standalone/store/emaps.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "standalone/webapi/answer.h"

namespace lookhaven::webapi {

namespace {

template <typename Records>
Json::Value IdsOf(const Records& cameras) {
    Json::Value ids(Json::arrayValue);
    for (const auto& [id, camera] : cameras) {
        ids.append(id);
    }
    return ids;
}

Json::Value Groups(binding::RequestContext& context) {
    const std::set<int> denied = PrivProfileGetByUid(context.Caller()).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK);
    Json::Value list(Json::arrayValue);
    for (const store::CameraGroup& group : store::Groups(context.Records()).List()) {
        CamGroup cameras;
        if (!denied.contains(group.id) && cameras.Load(group.id) == 0) {
            Json::Value& json = list.append(Json::objectValue);
            json["id"] = group.id;
            json["name"] = group.name;
            json["camera"] = IdsOf(cameras.GetCamMap());
        }
    }
    return list;
}

// A mount without a camera that the caller may see is nothing to a viewer.
Json::Value Mounts(binding::RequestContext& context) {
    const bool is_manager = binding::IsManager();
    Json::Value list(Json::arrayValue);
    for (const store::Mount& mount : store::Mounts(context.Records()).List()) {
        Json::Value cameras = IdsOf(GetCamMountMap(mount.id, "", true));
        if (is_manager || !cameras.empty()) {
            Json::Value& json = list.append(Json::objectValue);
            json["id"] = mount.id;
            json["name"] = mount.name;
            json["is_default"] = mount.is_default;
            json["enabled"] = mount.enabled;
            json["camera"] = std::move(cameras);
        }
    }
    return list;
}

Json::Value Emaps(binding::RequestContext& context) {
    Json::Value list(Json::arrayValue);
    for (const store::EmapSummary& emap : store::Emaps(context.Records()).List()) {
        if (binding::MaySee(store::DeniableItem::kEmap, emap.id)) {
            Json::Value& json = list.append(Json::objectValue);
            json["id"] = emap.id;
            json["name"] = emap.name;
            json["item_num"] = emap.item_count;
        }
    }
    return list;
}

}  // namespace

std::string ServeCatalog(binding::RequestContext& context, int version, const std::string& method) {
    Json::Value data;
    if (version == 1 && method == "Groups") {
        data["group"] = Groups(context);
    } else if (version == 1 && method == "Mounts") {
        data["mount"] = Mounts(context);
    } else if (version == 1 && method == "Emaps") {
        data["emap"] = Emaps(context);
    } else {
        throw Failure(404, "no such api, version or method");
    }
    return SuccessAnswer(data);
}

}  // namespace lookhaven::webapi
