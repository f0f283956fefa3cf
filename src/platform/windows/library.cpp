// The entry point of the DLL.
#include "platform/windows/system.h"

// Keeps the DLL loaded until the process ends, because nothing shows when a thread has left its last instructions in
// it. A program that unloads the DLL has no effect, and its static objects are destroyed once, at the end of the
// process.
extern "C" BOOL WINAPI DllMain(HINSTANCE /*library*/, DWORD reason, void* /*is_at_process_end*/) {
    if (reason != DLL_PROCESS_ATTACH) return TRUE;
    HMODULE pinned = nullptr;
    return GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_PIN | GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS,
                              reinterpret_cast<const char*>(&DllMain), &pinned);
}
