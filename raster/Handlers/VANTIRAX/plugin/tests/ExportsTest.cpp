// The export layer as the host sees it, on handles and files that never get
// as far as an image: the built handler file loaded at run time.
#include "tests/fixtures/HandlerLoader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>

namespace {

const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);

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
    EXPECT_EQ(rh.identify(&identity), 1);
    EXPECT_EQ(identity.version, 3);
    EXPECT_STREQ(identity.handlerName, "VANTIRAX.rhl");
    EXPECT_STREQ(identity.description, "CADRG, CIB and NITF Format Handler");
    EXPECT_EQ(identity.extensionCount, 1);
    EXPECT_STREQ(identity.extensions[0], "ntf");
    const auto* bytes = reinterpret_cast<const uint8_t*>(&identity);
    for (size_t offset = 1031; offset < sizeof identity; ++offset)
        ASSERT_EQ(bytes[offset], 0) << offset;
}

// Without a handler: close succeeds, every other call fails with status 5.
// A file whose header cannot be read leaves the handle as the host gave it.
TEST(Exports, CallsWithoutAHandlerAndOpensThatFailAtTheHeader)
{
    EXPECT_EQ(rh.close(nullptr), 1);
    EXPECT_EQ(rh.getLine(nullptr, 0, nullptr, nullptr), 0);
    RHHandle handle = FreshHandle();
    const int32_t rect[4] = {0, 0, 10, 10};
    uint32_t width = 0;
    uint8_t* row = nullptr;
    uint16_t flag = 9;
    for (int call = 0; call < 4; ++call) {
        handle.status = kHostStatus;
        EXPECT_EQ(call == 0   ? rh.startDraw(&handle, nullptr, rect, 0, &width)
                  : call == 1 ? rh.getLine(&handle, 0, &row, &flag)
                  : call == 2 ? rh.endDraw(&handle)
                              : rh.close(&handle) - 1,
                  0)
            << call;
        EXPECT_EQ(handle.status, kStatusFailed) << call;
    }
    TempFile empty(BuildNitfFile(NitfFilePlan{}), ".ntf"); // no image segments
    TempFile notNitf("plain text, not an image", ".ntf");
    const std::string overlong = "/tmp/" + std::string(300, 'p');
    for (const char* path : {empty.c_str(), notNitf.c_str(), overlong.c_str(), "/nonexistent.ntf"}) {
        handle = FreshHandle();
        EXPECT_EQ(rh.open(&handle, path), 0) << path;
        EXPECT_EQ(handle.status, kHostStatus);
        EXPECT_EQ(handle.handler, nullptr);
        EXPECT_EQ(rh.isFormat(path), 0);
    }
    EXPECT_EQ(rh.isFormat(nullptr), 0);
    handle = FreshHandle();
    EXPECT_EQ(rh.open(&handle, nullptr), 0);
    EXPECT_EQ(rh.open(nullptr, empty.c_str()), 0);
}

// The probe answers from the header alone: an RPFHDR extension of 48 bytes
// (either case) is a frame, even a damaged one; 47 or 49 bytes are not, and
// then the broken image subheader says no.
TEST(Exports, RpfTagDecidesTheBranchAndARefusedFrameStaysAttached)
{
    TempFile frame(BrokenFrame(), ".ntf");
    EXPECT_EQ(rh.isFormat(frame.c_str()), 1);
    EXPECT_EQ(rh.isFormat(TempFile(BrokenFrame("rpfhdr"), ".ntf").c_str()), 1);
    for (size_t dataLength : {47u, 49u})
        EXPECT_EQ(rh.isFormat(TempFile(BrokenFrame("RPFHDR", dataLength), ".ntf").c_str()), 0) << dataLength;

    // A frame the reader refuses: result 0, status 5, handler attached.
    RHHandle handle = FreshHandle();
    EXPECT_EQ(rh.open(&handle, frame.c_str()), 0);
    EXPECT_EQ(handle.status, kStatusFailed);
    ASSERT_NE(handle.handler, nullptr);
    EXPECT_EQ(std::string(handle.path), frame.path());
    // Drawing it: the lines fail with status 0 and a buffer handed out; the draw ends twice.
    const int32_t rect[4] = {10, 0, 110, 1};
    uint32_t width = 0;
    EXPECT_EQ(rh.startDraw(&handle, nullptr, rect, 1.5, &width), 1);
    EXPECT_EQ(width, 100u);
    EXPECT_EQ(handle.status, kStatusOk);
    uint8_t* row = nullptr;
    uint16_t flag = 9;
    EXPECT_EQ(rh.getLine(&handle, 0, &row, &flag), 0);
    EXPECT_EQ(handle.status, kStatusOk);
    EXPECT_NE(row, nullptr);
    EXPECT_EQ(flag, 0);
    EXPECT_EQ(rh.endDraw(&handle), 1);
    EXPECT_EQ(rh.endDraw(&handle), 1);
    EXPECT_EQ(handle.status, kStatusOk);
    EXPECT_EQ(rh.close(&handle), 1);
    EXPECT_EQ(handle.handler, nullptr);
    EXPECT_EQ(handle.status, kStatusOk);
}

// A draw that cannot start (a reversed rectangle, the file gone) detaches and
// releases the handler, its palette and georeference.
TEST(Exports, DrawThatCannotStartDetachesTheHandler)
{
    for (bool fileGone : {false, true}) {
        auto frame = std::make_unique<TempFile>(BrokenFrame(), ".ntf");
        RHHandle handle = FreshHandle();
        rh.open(&handle, frame->c_str());
        ASSERT_NE(handle.handler, nullptr);
        const int32_t reversed[4] = {50, 0, 10, 1}, good[4] = {0, 0, 10, 1};
        if (fileGone)
            frame.reset();
        uint32_t width = 0;
        EXPECT_EQ(rh.startDraw(&handle, nullptr, fileGone ? good : reversed, 0, &width), 0);
        EXPECT_EQ(handle.status, kStatusFailed);
        EXPECT_EQ(handle.handler, nullptr);
        EXPECT_EQ(handle.palette, nullptr);
        EXPECT_EQ(handle.geoRef, nullptr);
        EXPECT_EQ(rh.close(&handle), 1);
    }
}

} // namespace
