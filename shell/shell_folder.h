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

class CMarlixDLShellFolder
    : public CGravonShellFolderImpl<CMarlixDLShellFolder, CMarlixDLShellView, CMarlixDLEnumIDList,
                                    CMarlixDLContextMenu, CMarlixDLExtractIcon, CMarlixDLQueryInfo,
                                    CMarlixDLDataObject, CMarlixDLDropTarget> {
 public:
  CMarlixDLShellFolder();

  STDMETHODIMP GetClassID(CLSID* classId) noexcept override;
};

// The class object's creator: a root folder, positioned by IPersistFolder::Initialize.
HRESULT CreateMarlixDLShellFolder(REFIID riid, void** ppv) noexcept;
