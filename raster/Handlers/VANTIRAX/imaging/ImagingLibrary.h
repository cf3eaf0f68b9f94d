// The process-wide binding to the imaging library: its two modules and thirteen
// entry points, found by name once and guarded by the one LTGuard.
#pragma once

#include "imaging/ImagingRecords.h"

#include <cstddef>
#ifdef _WIN32
#include <windows.h>
#else
#include <pthread.h>
#endif

// The lock of the binding. One global instance lives from load to unload.
class LTGuard {
public:
    LTGuard();
    virtual ~LTGuard();
    LTGuard(const LTGuard&) = delete;
    LTGuard& operator=(const LTGuard&) = delete;
    void Enter();
    void Leave();

private:
#ifdef _WIN32
    CRITICAL_SECTION section;
#else
    pthread_mutex_t section;
#endif
};

// Module look-up: a module is a named table of named entry points.
using EntryPoint = void (*)();
struct ImagingEntry {
    const char* name;
    EntryPoint function;
};
struct ImagingModule {
    const char* name;
    const ImagingEntry* entries;
    size_t entryCount;
};
struct ImagingModuleTable {
    const ImagingModule* modules;
    size_t moduleCount;
};

extern const char* const kKernelModuleName;
extern const char* const kFileModuleName;

struct ImagingBinding {
    const ImagingModule* kernelModule;
    const ImagingModule* fileModule;
    L_InitBitmapFunction L_InitBitmap;
    L_AllocateBitmapFunction L_AllocateBitmap;
    L_FreeBitmapFunction L_FreeBitmap;
    L_AccessBitmapFunction L_AccessBitmap;
    L_GetBitmapRowColFunction L_GetBitmapRowCol;
    L_ReleaseBitmapFunction L_ReleaseBitmap;
    L_GetDefaultLoadFileOptionFunction L_GetDefaultLoadFileOption;
    L_LoadFileOffsetFunction L_LoadFileOffset;
    L_LoadBitmapMemoryFunction L_LoadBitmapMemory;
    L_LoadMemoryFunction L_LoadMemory;
    L_StartLoadRowsFunction L_StartLoadRows;
    L_LoadRowsFunction L_LoadRows;
    L_EndLoadRowsFunction L_EndLoadRows;
    uint8_t bound;
};

// True when both modules and all thirteen entry points are bound. A failed
// attempt is retried at the next call.
bool EnsureLibrary();
// Forgets the modules and entry points (the library is being unloaded).
void ResetLibrary();
// Copies the binding under the lock; false when it is not bound.
bool CopyBinding(ImagingBinding& binding);
// The modules the look-up sees: the built-in table, or another one put in
// place by tests (null restores the built-in table).
void UseImagingModules(const ImagingModuleTable* table);
const ImagingModuleTable& BuiltInImagingModules();
