#include "imaging/ImagingLibrary.h"

#include "imaging/BitmapKernel.h"
#include "imaging/FileLoader.h"

#include <cstring>

const char* const kKernelModuleName = "LTKRNX.DLL";
const char* const kFileModuleName = "LTFILX.DLL";

namespace {

template <typename Function>
EntryPoint AsEntry(Function function)
{
    return reinterpret_cast<EntryPoint>(function);
}

const ImagingEntry kKernelEntries[] = {
    {"L_InitBitmap", AsEntry(&L_InitBitmap)},
    {"L_AllocateBitmap", AsEntry(&L_AllocateBitmap)},
    {"L_FreeBitmap", AsEntry(&L_FreeBitmap)},
    {"L_AccessBitmap", AsEntry(&L_AccessBitmap)},
    {"L_GetBitmapRowCol", AsEntry(&L_GetBitmapRowCol)},
    {"L_ReleaseBitmap", AsEntry(&L_ReleaseBitmap)},
};

const ImagingEntry kFileEntries[] = {
    {"L_GetDefaultLoadFileOption", AsEntry(&L_GetDefaultLoadFileOption)},
    {"L_LoadFileOffset", AsEntry(&L_LoadFileOffset)},
    {"L_LoadBitmapMemory", AsEntry(&L_LoadBitmapMemory)},
    {"L_LoadMemory", AsEntry(&L_LoadMemory)},
    {"L_StartLoadRows", AsEntry(&L_StartLoadRows)},
    {"L_LoadRows", AsEntry(&L_LoadRows)},
    {"L_EndLoadRows", AsEntry(&L_EndLoadRows)},
};

const ImagingModule kBuiltInModules[] = {
    {kKernelModuleName, kKernelEntries, sizeof kKernelEntries / sizeof kKernelEntries[0]},
    {kFileModuleName, kFileEntries, sizeof kFileEntries / sizeof kFileEntries[0]},
};

const ImagingModuleTable kBuiltInTable = {kBuiltInModules, sizeof kBuiltInModules / sizeof kBuiltInModules[0]};

// The binding and the module table it looks in; both are guarded by gGuard.
LTGuard gGuard;
ImagingBinding gBinding = {};
const ImagingModuleTable* gModules = &kBuiltInTable;

const ImagingModule* FindModule(const char* name)
{
    for (size_t i = 0; i < gModules->moduleCount; ++i)
        if (std::strcmp(gModules->modules[i].name, name) == 0)
            return &gModules->modules[i];
    return nullptr;
}

// Keeps an entry point already found when this look-up does not find it.
template <typename Function>
void FindEntry(const ImagingModule* module, const char* name, Function& function)
{
    for (size_t i = 0; i < module->entryCount; ++i)
        if (std::strcmp(module->entries[i].name, name) == 0 && module->entries[i].function != nullptr)
            function = reinterpret_cast<Function>(module->entries[i].function);
}

void BindKernel(const ImagingModule* module)
{
    FindEntry(module, "L_InitBitmap", gBinding.L_InitBitmap);
    FindEntry(module, "L_AllocateBitmap", gBinding.L_AllocateBitmap);
    FindEntry(module, "L_FreeBitmap", gBinding.L_FreeBitmap);
    FindEntry(module, "L_AccessBitmap", gBinding.L_AccessBitmap);
    FindEntry(module, "L_GetBitmapRowCol", gBinding.L_GetBitmapRowCol);
    FindEntry(module, "L_ReleaseBitmap", gBinding.L_ReleaseBitmap);
}

void BindFile(const ImagingModule* module)
{
    FindEntry(module, "L_GetDefaultLoadFileOption", gBinding.L_GetDefaultLoadFileOption);
    FindEntry(module, "L_LoadFileOffset", gBinding.L_LoadFileOffset);
    FindEntry(module, "L_LoadBitmapMemory", gBinding.L_LoadBitmapMemory);
    FindEntry(module, "L_LoadMemory", gBinding.L_LoadMemory);
    FindEntry(module, "L_StartLoadRows", gBinding.L_StartLoadRows);
    FindEntry(module, "L_LoadRows", gBinding.L_LoadRows);
    FindEntry(module, "L_EndLoadRows", gBinding.L_EndLoadRows);
}

bool EveryEntryFound()
{
    const ImagingBinding& b = gBinding;
    return b.kernelModule && b.fileModule && b.L_InitBitmap && b.L_AllocateBitmap && b.L_FreeBitmap &&
           b.L_AccessBitmap && b.L_GetBitmapRowCol && b.L_ReleaseBitmap && b.L_GetDefaultLoadFileOption &&
           b.L_LoadFileOffset && b.L_LoadBitmapMemory && b.L_LoadMemory && b.L_StartLoadRows && b.L_LoadRows &&
           b.L_EndLoadRows;
}

}  // namespace

bool EnsureLibrary()
{
    gGuard.Enter();
    if (!gBinding.bound) {
        gBinding.kernelModule = FindModule(kKernelModuleName);
        gBinding.fileModule = FindModule(kFileModuleName);
        if (gBinding.kernelModule)
            BindKernel(gBinding.kernelModule);
        if (gBinding.fileModule)
            BindFile(gBinding.fileModule);
        gBinding.bound = EveryEntryFound() ? 1 : 0;
    }
    bool bound = gBinding.bound != 0;
    gGuard.Leave();
    return bound;
}

// The bound flag is cleared with the entry points, so that nothing can call
// through a forgotten binding; a later EnsureLibrary binds afresh.
void ResetLibrary()
{
    gGuard.Enter();
    gBinding = ImagingBinding{};
    gGuard.Leave();
}

bool CopyBinding(ImagingBinding& binding)
{
    gGuard.Enter();
    binding = gBinding;
    gGuard.Leave();
    return binding.bound != 0;
}

void UseImagingModules(const ImagingModuleTable* table)
{
    gGuard.Enter();
    gModules = table ? table : &kBuiltInTable;
    gGuard.Leave();
}

const ImagingModuleTable& BuiltInImagingModules()
{
    return kBuiltInTable;
}
