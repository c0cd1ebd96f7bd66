// Stands in for the framework module "vantrel.dll": the directory code looks for a module of that
// name in the process, so the test loads this one from a development-build layout.
#include <windows.h>

extern "C" BOOL WINAPI DllMain(HINSTANCE, DWORD, LPVOID) { return TRUE; }
