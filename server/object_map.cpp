#include "server/object_map.h"

#include "base/class_ids.h"
#include "base/resource_ids.h"
#include "shell/enum_id_list.h"
#include "shell/extract_icon.h"
#include "shell/query_info.h"
#include "shell/shell_folder.h"
#include "shell/shell_view.h"
#include "transfer/data_object.h"
#include "transfer/drop_target.h"

namespace {
const ObjectMapEntry kObjectMap[] = {
    {&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
    {&CLSID_MarlixDLShellView, IDR_REG_SHELLVIEW, CreateMarlixDLShellView},
    {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList},
    {&CLSID_MarlixDLExtractIcon, IDR_REG_EXTRACTICON, CreateMarlixDLExtractIcon},
    {&CLSID_MarlixDLDataObject, IDR_REG_DATAOBJECT, CreateMarlixDLDataObject},
    {&CLSID_MarlixDLQueryInfo, IDR_REG_QUERYINFO, CreateMarlixDLQueryInfo},
    {&CLSID_MarlixDLDropTarget, IDR_REG_DROPTARGET, CreateMarlixDLDropTarget},
    {&CLSID_MarlixDLDropTargetOnListView, IDR_REG_DROPTARGETONLIST, CreateMarlixDLDropTargetOnListView},
};
}  // namespace

std::span<const ObjectMapEntry> ModuleObjectMap() noexcept { return kObjectMap; }

const ObjectMapEntry* FindObjectMapEntry(std::span<const ObjectMapEntry> map, REFCLSID clsid) noexcept {
  for (const auto& entry : map)
    if (IsEqualCLSID(*entry.clsid, clsid)) return &entry;
  return nullptr;
}
