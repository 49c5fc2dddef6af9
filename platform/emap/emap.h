// SPDX-License-Identifier: Apache-2.0
//
// E-maps: floor plans with devices placed on them.
#pragma once

#include <memory>
#include <string>

#include "platform/export.h"

// The kinds of items that the module shows; it skips all others.
enum EMAP_ITEM_TYPE : int {
    EMAP_ITEM_CAMERA = 0,
    EMAP_ITEM_EMAP = 1,  // a link to another e-map
    EMAP_ITEM_DOOR = 2,
    EMAP_ITEM_IO_MODULE = 3,
    EMAP_ITEM_POS = 4,
};

struct __tag_EMAP_ITEM_INFO {
    int m_Type = 0;  // EMAP_ITEM_TYPE
    int m_Id = 0;    // the device's id on its own server
    std::string m_Name;
    int m_HxId = 0;  // the recording server that owns the device; 0: this host
    int m_X = 0;     // in pixels of the picture
    int m_Y = 0;
    int m_Direction = 0;
    int m_TextPos = 0;  // placement of the name
    int m_IconCenterX = 0;
    int m_IconCenterY = 0;
    int m_PortIdx = 0;  // the device's input or output, from 0; below 0 for none
};

class LH_PLATFORM_API Emap {
  public:
    Emap();
    Emap(const Emap&) = delete;
    Emap& operator=(const Emap&) = delete;
    ~Emap();

    // Returns 0, or non-zero when there is no such e-map or the caller may not see it.
    int Load(int emapId);

    // The picture's file name, without a folder.
    std::string GetImgName() const;
    int GetItemNum() const;
    // Returns 0, or non-zero when there is no item at the index; then the item is unchanged.
    int GetItem(int index, __tag_EMAP_ITEM_INFO& item) const;
    // How the client draws the items: without their names, small.
    bool GetHideItemName() const;
    bool GetSmallItemSize() const;

  private:
    struct Record;

    std::unique_ptr<Record> m_pRecord;
};

// The picture's file in base64; length: the number of base64 characters. Empty, with length 0, when it cannot be read,
// which fails no request. imageName: a name from Emap::GetImgName.
LH_PLATFORM_API std::string LoadEmapImgBase64String(const std::string& imageName, int& length);
