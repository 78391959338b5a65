// The module's one application object: everything the module does at load and unload.
#pragma once
#include <windows.h>

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

 private:
  CServerModule server_;
};

CModuleApp& TheModuleApp() noexcept;
