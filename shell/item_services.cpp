#include "shell/item_services.h"

#include <initializer_list>

#include "base/module_instance.h"
#include "base/resource_ids.h"

HIMAGELIST LargeImageList = nullptr;
HIMAGELIST SmallImageList = nullptr;

namespace {

void BuildList(HIMAGELIST& list, int cx, int cy) {
  if (list) ImageList_Destroy(list);
  list = ImageList_Create(cx, cy, ILC_COLOR32, 4, 0);
  if (!list) return;
  // The order fixes the indexes of ItemImage.
  for (int id : {IDI_LEVEL, IDI_ADD_LEVEL, IDI_VIRTUAL_FILE}) {
    HICON icon = static_cast<HICON>(
        LoadImageW(ModuleInstance(), MAKEINTRESOURCEW(id), IMAGE_ICON, cx, cy, LR_CREATEDIBSECTION));
    ImageList_ReplaceIcon(list, -1, icon);
    if (icon) DestroyIcon(icon);
  }
}

void DestroyList(HIMAGELIST& list) {
  if (list) ImageList_Destroy(list);
  list = nullptr;
}

}  // namespace

void LoadImageLists() {
  BuildList(LargeImageList, GetSystemMetrics(SM_CXICON), GetSystemMetrics(SM_CYICON));
  BuildList(SmallImageList, GetSystemMetrics(SM_CXSMICON), GetSystemMetrics(SM_CYSMICON));
}

void DestroyImageLists() {
  DestroyList(LargeImageList);
  DestroyList(SmallImageList);
}
