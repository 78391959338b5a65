#include "server/module_app.h"

#include "server/class_ids.h"
#include "base/module_instance.h"
#include "shell/item_services.h"
#include "store/station_record.h"

namespace {
CModuleApp theApp;
}

CModuleApp& TheModuleApp() noexcept { return theApp; }

// Runs under the loader lock: registry reads and image lists only, nothing that
// loads a library or waits for a thread.
BOOL CModuleApp::InitInstance() {
  server_.SetTypeLibId(LIBID_MarlixDLShellExtLib);
  server_.Init(ModuleObjectMap(), ModuleInstance());
  if (!CAppBase::InitInstance()) return FALSE;
  resource_ = ModuleInstance();
  LoadDisplaySettings();
  LoadImageLists();
  return TRUE;
}

int CModuleApp::ExitInstance() {
  SaveDisplaySettings();
  DestroyImageLists();
  server_.Term();
  return CAppBase::ExitInstance();
}
