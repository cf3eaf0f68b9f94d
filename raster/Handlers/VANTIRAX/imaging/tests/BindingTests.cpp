#include "imaging/ImagingLibrary.h"
#include "imaging/LeadToolLibWrapper.h"

#include <gtest/gtest.h>

#include <cstring>
#include <vector>

namespace {

// A module table made of the built-in modules, less what a test leaves out.
struct TrimmedModules {
    std::vector<ImagingEntry> kernelEntries;
    std::vector<ImagingEntry> fileEntries;
    std::vector<ImagingModule> modules;
    ImagingModuleTable table {};

    TrimmedModules(bool withKernel, bool withFile, const char* missingEntry = nullptr)
    {
        const ImagingModuleTable& builtIn = BuiltInImagingModules();
        for (size_t m = 0; m < builtIn.moduleCount; ++m) {
            const ImagingModule& module = builtIn.modules[m];
            bool kernel = std::strcmp(module.name, kKernelModuleName) == 0;
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

class BindingTest : public ::testing::Test {
protected:
    void SetUp() override { ResetLibrary(); }
    void TearDown() override
    {
        UseImagingModules(nullptr);
        ResetLibrary();
    }
};

TEST_F(BindingTest, MissingModulesRefuseUntilBothArePresent)
{
    TrimmedModules neither(false, false);
    UseImagingModules(&neither.table);
    EXPECT_FALSE(EnsureLibrary());
    CLeadToolLibWrapper decoder;
    EXPECT_FALSE(decoder.PrepareBiLevel());
    EXPECT_EQ(decoder.kind, kNotPrepared);

    TrimmedModules kernelOnly(true, false);
    UseImagingModules(&kernelOnly.table);
    EXPECT_FALSE(EnsureLibrary());
    EXPECT_FALSE(decoder.PrepareBiLevel());

    UseImagingModules(nullptr);
    EXPECT_TRUE(EnsureLibrary());
    EXPECT_TRUE(decoder.PrepareBiLevel());
    EXPECT_EQ(decoder.kind, kBiLevelDecoder);
}

TEST_F(BindingTest, EveryEntryPointIsRequired)
{
    const char* names[] = {"L_InitBitmap", "L_AllocateBitmap", "L_FreeBitmap", "L_AccessBitmap",
                           "L_GetBitmapRowCol", "L_ReleaseBitmap", "L_GetDefaultLoadFileOption",
                           "L_LoadFileOffset", "L_LoadBitmapMemory", "L_LoadMemory"};
    for (const char* name : names) {
        ResetLibrary();
        TrimmedModules partial(true, true, name);
        UseImagingModules(&partial.table);
        EXPECT_FALSE(EnsureLibrary()) << name;
        UseImagingModules(nullptr);
    }
}

TEST_F(BindingTest, ResetForgetsTheBindingAndALaterCallBindsAgain)
{
    ASSERT_TRUE(EnsureLibrary());
    ResetLibrary();
    ImagingBinding binding {};
    EXPECT_FALSE(CopyBinding(binding));
    EXPECT_EQ(binding.L_LoadMemory, nullptr);
    EXPECT_TRUE(EnsureLibrary());
    EXPECT_TRUE(CopyBinding(binding));
    EXPECT_NE(binding.L_LoadMemory, nullptr);
}

}  // namespace
