// The imaging modules are bound once, whole: without either module or any of
// its entry points nothing is bound and no decoder is prepared.
#include "imaging/ImagingLibrary.h"
#include "imaging/LeadToolLibWrapper.h"

#include <gtest/gtest.h>

#include <cstring>
#include <vector>

namespace {

// A module table made of the built-in modules, less what a test leaves out.
struct TrimmedModules {
    std::vector<ImagingEntry> kernelEntries, fileEntries;
    std::vector<ImagingModule> modules;
    ImagingModuleTable table{};

    TrimmedModules(bool withKernel, bool withFile, const char* missingEntry)
    {
        const ImagingModuleTable& builtIn = BuiltInImagingModules();
        for (size_t m = 0; m < builtIn.moduleCount; ++m) {
            const ImagingModule& module = builtIn.modules[m];
            const bool kernel = std::strcmp(module.name, kKernelModuleName) == 0;
            std::vector<ImagingEntry>& entries = kernel ? kernelEntries : fileEntries;
            for (size_t e = 0; e < module.entryCount; ++e)
                if (missingEntry == nullptr || std::strcmp(module.entries[e].name, missingEntry) != 0)
                    entries.push_back(module.entries[e]);
        }
        if (withKernel)
            modules.push_back({kKernelModuleName, kernelEntries.data(), kernelEntries.size()});
        if (withFile)
            modules.push_back({kFileModuleName, fileEntries.data(), fileEntries.size()});
        table = {modules.data(), modules.size()};
    }
};

TEST(Binding, NeedsBothModulesAndEveryEntryPointAndBindsAgainAfterAReset)
{
    struct Case {
        bool kernel, file;
        const char* missing;
    };
    std::vector<Case> cases = {{false, false, nullptr}, {true, false, nullptr}, {false, true, nullptr}};
    for (const char* name : {"L_InitBitmap", "L_AllocateBitmap", "L_FreeBitmap", "L_AccessBitmap", "L_GetBitmapRowCol",
                             "L_ReleaseBitmap", "L_GetDefaultLoadFileOption", "L_LoadFileOffset", "L_LoadBitmapMemory",
                             "L_LoadMemory"})
        cases.push_back({true, true, name});
    for (const Case& c : cases) {
        ResetLibrary();
        TrimmedModules partial(c.kernel, c.file, c.missing);
        UseImagingModules(&partial.table);
        EXPECT_FALSE(EnsureLibrary()) << c.kernel << c.file << (c.missing ? c.missing : "");
        CLeadToolLibWrapper decoder;
        EXPECT_FALSE(decoder.PrepareBiLevel());
        EXPECT_EQ(decoder.kind, kNotPrepared);
        UseImagingModules(nullptr);
    }
    ResetLibrary();
    ImagingBinding binding{};
    EXPECT_FALSE(CopyBinding(binding));
    EXPECT_EQ(binding.L_LoadMemory, nullptr);
    CLeadToolLibWrapper decoder;
    EXPECT_TRUE(decoder.PrepareBiLevel());
    EXPECT_EQ(decoder.kind, kBiLevelDecoder);
    EXPECT_TRUE(CopyBinding(binding));
    EXPECT_NE(binding.L_LoadMemory, nullptr);
}

} // namespace
