// The namespace folder "Marlix Digital Levels" and each level below it.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include "shell/context_menu.h"
#include "shell/enum_id_list.h"
#include "shell/extract_icon.h"
#include "shell/query_info.h"
#include "shell/shell_folder_impl.h"
#include "shell/shell_view.h"
#include "transfer/data_object.h"
#include "transfer/drop_target.h"

// The classes the folder hands out that live elsewhere; each becomes its real class
// here once it is in the module.
using MarlixDLShellViewClass = CMarlixDLShellView;
using MarlixDLDataObjectClass = CMarlixDLDataObject;
using MarlixDLDropTargetClass = CMarlixDLDropTarget;

class CMarlixDLShellFolder
    : public CGravonShellFolderImpl<CMarlixDLShellFolder, MarlixDLShellViewClass, CMarlixDLEnumIDList,
                                    CMarlixDLContextMenu, CMarlixDLExtractIcon, CMarlixDLQueryInfo,
                                    MarlixDLDataObjectClass, MarlixDLDropTargetClass> {
 public:
  CMarlixDLShellFolder();

  STDMETHODIMP GetClassID(CLSID* classId) override;
};
