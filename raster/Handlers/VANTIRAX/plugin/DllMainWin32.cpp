// The loader's notifications: the imaging binding is forgotten when the DLL
// is unloaded; every notification is answered with success.
#include "imaging/ImagingLibrary.h"

#include <windows.h>

extern "C" BOOL WINAPI DllMain(HINSTANCE /*instance*/, DWORD reason, LPVOID reserved)
{
    // A non-null reserved means the process is ending: its other threads are
    // already stopped, possibly inside the binding's lock, so it is not taken.
    if (reason == DLL_PROCESS_DETACH && reserved == nullptr)
        ResetLibrary();
    return TRUE;
}
