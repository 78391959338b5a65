// The process-wide pictures of the namespace, shared by every view and icon object.
#pragma once
#include <windows.h>
#include <commctrl.h>

#include "base/win_handles.h"

// Fixed indexes in both lists.
enum ItemImage : int {
  IMAGE_LEVEL = 0,
  IMAGE_ADD_LEVEL = 1,
  IMAGE_VIRTUAL_FILE = 2,
};

// Icons at SM_CXICON and SM_CXSMICON. Only LoadImageLists writes them; views show
// them with LVS_SHAREIMAGELISTS and never destroy them.
extern win::UniqueImageList LargeImageList;
extern win::UniqueImageList SmallImageList;

// Module start: (re)builds both lists from icons 101, 102, 104 of `module` (null: this
// module's own).
void LoadImageLists(HINSTANCE module = nullptr);
// Module end.
void DestroyImageLists();
