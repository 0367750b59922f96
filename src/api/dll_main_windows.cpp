// The DLL entry point: the library keeps no per-thread state, so it asks not
// to be told of thread start and end, and does nothing else at load.
#include <windows.h>

BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
  if (reason == DLL_PROCESS_ATTACH) DisableThreadLibraryCalls(instance);
  return TRUE;
}
