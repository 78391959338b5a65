#include <windows.h>

// The module's start and stop are driven from the core's module object; the loader
// only needs an entry point here until that object is linked in.
extern "C" BOOL WINAPI DllMain(HINSTANCE, DWORD, LPVOID) { return TRUE; }
