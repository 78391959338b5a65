#include "shell/item_services.h"

#include <initializer_list>
#include <vector>

#include "base/module_instance.h"
#include "base/resource_ids.h"

win::UniqueImageList LargeImageList;
win::UniqueImageList SmallImageList;

namespace {

// A fully transparent picture, standing in for an icon that could not be loaded.
HICON BlankIcon(int cx, int cy) {
  const size_t rowBytes = static_cast<size_t>((cx + 15) / 16 * 2);
  std::vector<BYTE> andMask(rowBytes * static_cast<size_t>(cy), 0xFF), xorMask(andMask.size(), 0);
  return CreateIcon(nullptr, cx, cy, 1, 1, andMask.data(), xorMask.data());
}

void BuildList(HINSTANCE module, win::UniqueImageList& list, int cx, int cy) {
  list.Reset(ImageList_Create(cx, cy, ILC_COLOR32, 4, 0));
  if (!list) return;
  // The order fixes the indexes of ItemImage; a missing icon keeps its place.
  for (int id : {IDI_LEVEL, IDI_ADD_LEVEL, IDI_VIRTUAL_FILE}) {
    win::UniqueIcon icon(static_cast<HICON>(
        LoadImageW(module, MAKEINTRESOURCEW(id), IMAGE_ICON, cx, cy, LR_CREATEDIBSECTION)));
    if (!icon) icon.Reset(BlankIcon(cx, cy));
    ImageList_ReplaceIcon(list.Get(), -1, icon.Get());
  }
}

}  // namespace

void LoadImageLists(HINSTANCE module) {
  if (!module) module = ModuleInstance();
  BuildList(module, LargeImageList, GetSystemMetrics(SM_CXICON), GetSystemMetrics(SM_CYICON));
  BuildList(module, SmallImageList, GetSystemMetrics(SM_CXSMICON), GetSystemMetrics(SM_CYSMICON));
}

void DestroyImageLists() {
  LargeImageList.Reset();
  SmallImageList.Reset();
}
