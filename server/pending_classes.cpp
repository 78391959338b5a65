// Creators of classes whose code is not in the module yet. Whoever brings a class
// removes its stub here and defines the creator beside the class.
#include "server/class_creators.h"

namespace {
HRESULT NotAvailable(void** ppv) {
  if (ppv) *ppv = nullptr;
  return CLASS_E_CLASSNOTAVAILABLE;
}
}  // namespace

HRESULT CreateMarlixDLShellView(REFIID, void** ppv) { return NotAvailable(ppv); }
