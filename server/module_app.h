// The module's one application object: everything the module does at load and unload.
#pragma once
#include <windows.h>

#include <atomic>

#include "server/server_module.h"

// The application base: keeps the instance that resources are loaded from.
class CAppBase {
 public:
  virtual ~CAppBase() = default;
  virtual BOOL InitInstance() { return TRUE; }
  virtual int ExitInstance() { return 0; }
  HINSTANCE ResourceInstance() const noexcept { return resource_; }

 protected:
  HINSTANCE resource_ = nullptr;
};

class CModuleApp : public CAppBase {
 public:
  BOOL InitInstance() override;
  int ExitInstance() override;
  CServerModule& Server() noexcept { return server_; }
  // Every export a host calls runs this first: with the log on, the first one writes its
  // header and starts listening at the module's edge, off the loader lock.
  void OnHostCall() noexcept;

 private:
  CServerModule server_;
  bool logging_ = false;
  std::atomic<bool> logHeaderWritten_{false};
};

CModuleApp& TheModuleApp() noexcept;
