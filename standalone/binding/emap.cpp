// SPDX-License-Identifier: Apache-2.0
//
// E-maps with the items placed on them, as far as the caller may see the map.
#include "platform/emap/emap.h"

#include "platform/emap/device.h"
#include "standalone/base/text.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/emaps.h"

namespace store = lookhaven::store;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

static_assert(static_cast<int>(store::EmapItemType::kCamera) == EMAP_ITEM_CAMERA);
static_assert(static_cast<int>(store::EmapItemType::kEmap) == EMAP_ITEM_EMAP);
static_assert(static_cast<int>(store::EmapItemType::kDoor) == EMAP_ITEM_DOOR);
static_assert(static_cast<int>(store::EmapItemType::kIoModule) == EMAP_ITEM_IO_MODULE);
static_assert(static_cast<int>(store::EmapItemType::kPos) == EMAP_ITEM_POS);

namespace {

constexpr int kNotFound = -1;

// For a paired host the module leaves no item out by itself.
void LeaveOutDeniedCameras(std::vector<store::EmapItem>& items) {
    const std::set<int> denied = lookhaven::binding::DeniedCameras(store::CameraAccess::kLive);
    std::erase_if(items, [&denied](const store::EmapItem& item) {
        return item.type == store::EmapItemType::kCamera && !denied.empty() &&
               denied.contains(item.server_id == 0 ? item.device_id : GetCamIdOnHost(item.server_id, item.device_id));
    });
}

}  // namespace

struct Emap::Record {
    store::Emap emap;
    std::vector<store::EmapItem> items;
};

Emap::Emap() : m_pRecord(std::make_unique<Record>()) {}
Emap::~Emap() = default;

int Emap::Load(int emapId) {
    return OrFailure("Emap::Load", kNotFound, [&] {
        if (!lookhaven::binding::MaySee(store::DeniableItem::kEmap, emapId)) {
            return kNotFound;
        }
        store::Emaps emaps(RequestContext::Current().Records());
        const auto found = emaps.Find(emapId);
        if (!found) {
            return kNotFound;
        }
        *m_pRecord = {*found, emaps.Items(emapId)};
        LeaveOutDeniedCameras(m_pRecord->items);
        return 0;
    });
}

std::string Emap::GetImgName() const {
    return m_pRecord->emap.image;
}

int Emap::GetItemNum() const {
    return static_cast<int>(m_pRecord->items.size());
}

int Emap::GetItem(int index, __tag_EMAP_ITEM_INFO& item) const {
    if (index < 0 || index >= GetItemNum()) {
        return kNotFound;
    }
    const store::EmapItem& from = m_pRecord->items[static_cast<std::size_t>(index)];
    item = {static_cast<int>(from.type),
            from.device_id,
            from.name,
            from.server_id,
            from.x,
            from.y,
            from.direction,
            from.text_pos,
            from.icon_center_x,
            from.icon_center_y,
            from.port};
    return 0;
}

bool Emap::GetHideItemName() const {
    return m_pRecord->emap.hide_names;
}

bool Emap::GetSmallItemSize() const {
    return m_pRecord->emap.small_items;
}

std::string LoadEmapImgBase64String(const std::string& imageName, int& length) {
    const std::string text = OrFailure("LoadEmapImgBase64String", std::string(), [&] {
        RequestContext& context = RequestContext::Current();
        return lookhaven::base::ToBase64(
            lookhaven::emap::Pictures(context.Records(), context.Installation().Home()).Read(imageName));
    });
    length = static_cast<int>(text.size());
    return text;
}
