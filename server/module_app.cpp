#include "server/module_app.h"

#include "base/class_ids.h"
#include "base/module_instance.h"
#include "helpers/error_reporter.h"
#include "shell/item_services.h"
#include "store/station_record.h"
#include "store/string_table.h"

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
  kld::ft::SetErrorTextSource(LoadTranslatedString);
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
