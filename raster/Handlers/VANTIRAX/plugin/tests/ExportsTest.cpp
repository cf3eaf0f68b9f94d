// The export layer as the host sees it: the built handler file loaded at run
// time, driven through its seven functions.
#include "plugin/HostRecords.h"
#include "tests/fixtures/HandlerLoader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>

namespace {

using Handler = HandlerExports;

const Handler& LoadedHandler()
{
    return LoadHandler(VX_HANDLER_PATH);
}

constexpr uint32_t kHostStatus = 77; // a value the library never writes

RHHandle FreshHandle()
{
    RHHandle handle;
    std::memset(&handle, 0, sizeof handle);
    handle.status = kHostStatus;
    return handle;
}

// A NITF 2.1 file with one image segment and an RPFHDR extension whose RPF
// sections are missing: recognised as a frame, refused by the frame reader.
std::string BrokenFrame(const std::string& tag = "RPFHDR", size_t headerDataLength = 48)
{
    NitfFilePlan plan;
    plan.images.push_back({std::string(100, 'x'), std::string(100, 'y')});
    plan.userHeaderData = Tre(tag, std::string(headerDataLength, '\0'));
    return BuildNitfFile(plan);
}

TEST(Exports, IdentityRecordIsCopiedWhole)
{
    RHIdentity identity;
    std::memset(&identity, 0xEE, sizeof identity);
    EXPECT_EQ(LoadedHandler().identify(&identity), 1);
    EXPECT_EQ(identity.version, 3);
    EXPECT_STREQ(identity.handlerName, "VANTIRAX.rhl");
    EXPECT_STREQ(identity.description, "CADRG, CIB and NITF Format Handler");
    EXPECT_EQ(identity.extensionCount, 1);
    EXPECT_STREQ(identity.extensions[0], "ntf");
    const auto* bytes = reinterpret_cast<const uint8_t*>(&identity);
    for (size_t offset = 1031; offset < sizeof identity; ++offset)
        ASSERT_EQ(bytes[offset], 0) << offset;
}

TEST(Exports, HandlesWithoutHandlerAnswerWithStatus5)
{
    const Handler& rh = LoadedHandler();
    EXPECT_EQ(rh.close(nullptr), 1);
    EXPECT_EQ(rh.getLine(nullptr, 0, nullptr, nullptr), 0);

    RHHandle handle = FreshHandle();
    int32_t rect[4] = {0, 0, 10, 10};
    uint32_t width = 0;
    EXPECT_EQ(rh.startDraw(&handle, nullptr, rect, 0, &width), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    uint8_t* row = nullptr;
    uint16_t flag = 9;
    handle.status = kHostStatus;
    EXPECT_EQ(rh.getLine(&handle, 0, &row, &flag), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    handle.status = kHostStatus;
    EXPECT_EQ(rh.endDraw(&handle), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    handle.status = kHostStatus;
    EXPECT_EQ(rh.close(&handle), 1);
    EXPECT_EQ(handle.status, kStatusFailed);
}

TEST(Exports, HeaderFailuresLeaveTheHandleAlone)
{
    const Handler& rh = LoadedHandler();
    NitfFilePlan noImages;
    TempFile empty(BuildNitfFile(noImages), ".ntf");
    TempFile notNitf("plain text, not an image", ".ntf");
    std::string overlong = "/tmp/" + std::string(300, 'p');
    for (const char* path : {empty.c_str(), notNitf.c_str(), overlong.c_str(), "/nonexistent.ntf"}) {
        RHHandle handle = FreshHandle();
        EXPECT_EQ(rh.open(&handle, path), 0) << path;
        EXPECT_EQ(handle.status, kHostStatus);
        EXPECT_EQ(handle.handler, nullptr);
        EXPECT_EQ(rh.isFormat(path), 0);
    }
    EXPECT_EQ(rh.isFormat(nullptr), 0);
    RHHandle handle = FreshHandle();
    EXPECT_EQ(rh.open(&handle, nullptr), 0);
    EXPECT_EQ(rh.open(nullptr, empty.c_str()), 0);
}

TEST(Exports, RpfTagDecidesTheBranch)
{
    const Handler& rh = LoadedHandler();
    // The probe answers yes from the header alone, even though the frame is damaged.
    TempFile frame(BrokenFrame(), ".ntf");
    TempFile lowerCase(BrokenFrame("rpfhdr"), ".ntf");
    EXPECT_EQ(rh.isFormat(frame.c_str()), 1);
    EXPECT_EQ(rh.isFormat(lowerCase.c_str()), 1);
    // UDHDL 61 and 63: not a frame; the broken image subheader then says no.
    for (size_t dataLength : {47u, 49u}) {
        TempFile other(BrokenFrame("RPFHDR", dataLength), ".ntf");
        EXPECT_EQ(rh.isFormat(other.c_str()), 0) << dataLength;
    }

    // A frame the reader refuses: result 0, status 5, handler attached.
    RHHandle handle = FreshHandle();
    EXPECT_EQ(rh.open(&handle, frame.c_str()), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    EXPECT_NE(handle.handler, nullptr);
    EXPECT_EQ(std::string(handle.path), frame.path());
    EXPECT_EQ(rh.close(&handle), 1);
    EXPECT_EQ(handle.handler, nullptr);
    EXPECT_EQ(handle.status, kStatusOk);
}

TEST(Exports, DrawLifecycleOnAnAttachedHandler)
{
    const Handler& rh = LoadedHandler();
    TempFile frame(BrokenFrame(), ".ntf");
    RHHandle handle = FreshHandle();
    rh.open(&handle, frame.c_str());
    ASSERT_NE(handle.handler, nullptr);

    int32_t rect[4] = {10, 0, 110, 1};
    uint32_t width = 0;
    EXPECT_EQ(rh.startDraw(&handle, nullptr, rect, 1.5, &width), 1);
    EXPECT_EQ(width, 100u);
    EXPECT_EQ(handle.status, kStatusOk);
    // The frame never opened, so the line fails: result 0, status 0, buffer handed out.
    uint8_t* row = nullptr;
    uint16_t flag = 9;
    EXPECT_EQ(rh.getLine(&handle, 0, &row, &flag), 0);
    EXPECT_EQ(handle.status, kStatusOk);
    EXPECT_NE(row, nullptr);
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(rh.endDraw(&handle), 1);
    EXPECT_EQ(rh.endDraw(&handle), 1);
    EXPECT_EQ(handle.status, kStatusOk);

    // A reversed rectangle cannot be drawn: the handler is detached (and released).
    int32_t reversed[4] = {50, 0, 10, 1};
    EXPECT_EQ(rh.startDraw(&handle, nullptr, reversed, 0, &width), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    EXPECT_EQ(handle.handler, nullptr);
    EXPECT_EQ(rh.close(&handle), 1);
}

TEST(Exports, FileDeletedBetweenOpenAndDrawDetachesTheHandler)
{
    const Handler& rh = LoadedHandler();
    auto frame = std::make_unique<TempFile>(BrokenFrame(), ".ntf");
    RHHandle handle = FreshHandle();
    rh.open(&handle, frame->c_str());
    ASSERT_NE(handle.handler, nullptr);
    frame.reset();
    int32_t rect[4] = {0, 0, 10, 1};
    uint32_t width = 0;
    EXPECT_EQ(rh.startDraw(&handle, nullptr, rect, 0, &width), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    EXPECT_EQ(handle.handler, nullptr);
    EXPECT_EQ(handle.palette, nullptr);
    EXPECT_EQ(handle.geoRef, nullptr);
    EXPECT_EQ(rh.close(&handle), 1);
}

} // namespace
