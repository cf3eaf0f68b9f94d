#include "imaging/ImagingLibrary.h"

LTGuard::LTGuard()
{
    InitializeCriticalSection(&section);
}

LTGuard::~LTGuard()
{
    DeleteCriticalSection(&section);
}

void LTGuard::Enter()
{
    EnterCriticalSection(&section);
}

void LTGuard::Leave()
{
    LeaveCriticalSection(&section);
}
