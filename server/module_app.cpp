#include "server/module_app.h"

#include "base/boundary.h"
#include "base/class_ids.h"
#include "base/module_instance.h"
#include "helpers/app_helpers.h"
#include "helpers/error_reporter.h"
#include "helpers/filelog.h"
#include "helpers/stack_dump.h"
#include "shell/item_services.h"
#include "store/station_record.h"
#include "store/string_table.h"
#include "marlix_version.h"

namespace {
CModuleApp theApp;
// The log's file is "<name>_<process id>.log" in the user's temporary folder.
constexpr wchar_t kLogName[] = L"MarlixDLShellExt";
}  // namespace

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
  // Opening the file is all the loader lock allows; the header waits for the first host call.
  logging_ = DiagnosticLogWanted() && kld::ft::StartFilelog(kLogName, false);
  kld::ft::LogTextA("Loaded into process %lu", GetCurrentProcessId());
  return TRUE;
}

void CModuleApp::OnHostCall() noexcept {
  if (!logging_ || logHeaderWritten_.exchange(true)) return;
  boundary::CallVoid([] {
    kld::ft::LogTextA("Host %ls (%ls), module version %ls", kld::ft::GetExecutablePath().c_str(),
                      kld::ft::GetAppNameW().c_str(), MARLIX_VERSION_WIDE);
  });
  boundary::failureSink = &kld::ft::LogBoundaryFailure;
}

int CModuleApp::ExitInstance() {
  boundary::failureSink = nullptr;
  SaveDisplaySettings();
  DestroyImageLists();
  server_.Term();
  kld::ft::LogTextA("Unloaded");
  if (logging_) kld::ft::StopFilelog();
  return CAppBase::ExitInstance();
}
