// The export layer as the host sees it, on handles and files that never get
// as far as an image: the built handler file loaded at run time.
#include "tests/fixtures/HandlerLoader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>

namespace {

const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
constexpr uint32_t kHostStatus = 77; // a value the library never writes

const auto FreshHandle = [] { RHHandle handle{}; handle.status = kHostStatus; return handle; };

// The names and the extension list are compared by HostCommandsTest ("identify").
TEST(Exports, IdentityRecordIsCopiedWhole)
{
    RHIdentity identity;
    auto* bytes = reinterpret_cast<uint8_t*>(&identity);
    std::fill_n(bytes, sizeof identity, 0xEE);
    EXPECT_TRUE(rh.identify(&identity) == 1 && identity.version == 3 && identity.extensionCount == 1);
    EXPECT_EQ(size_t(std::count(bytes + 1031, bytes + sizeof identity, 0)), sizeof identity - 1031);
}

// Without a handler: close succeeds, every other call fails with status 5. A file whose header
// cannot be read leaves the handle as the host gave it. A frame whose RPF sections are missing
// keeps its handler and draws failing lines; a draw that cannot start (a reversed rectangle,
// the file gone) detaches and releases the handler, its palette and georeference.
TEST(Exports, CallsWithoutAHandlerFailedOpensAndARefusedFrame)
{
    EXPECT_TRUE(rh.close(nullptr) == 1 && rh.getLine(nullptr, 0, nullptr, nullptr) == 0);
    RHHandle handle = FreshHandle();
    const int32_t rect[4] = {10, 0, 110, 1}, reversed[4] = {50, 0, 10, 1};
    struct { uint32_t width = 0; uint8_t* row = nullptr; uint16_t flag = 9; } out; // what the calls write
    const auto failsWithStatus5 = [&handle](int32_t result) {
        EXPECT_TRUE(result == 0 && handle.status == kStatusFailed);
        handle.status = kHostStatus;
    };
    failsWithStatus5(rh.startDraw(&handle, nullptr, rect, 0, &out.width));
    failsWithStatus5(rh.getLine(&handle, 0, &out.row, &out.flag));
    failsWithStatus5(rh.endDraw(&handle));
    failsWithStatus5(rh.close(&handle) - 1);
    TempFile empty(BuildNitfFile(NitfFilePlan{}), ".ntf"), notNitf("plain text, not an image", ".ntf");
    const std::string overlong = "/tmp/" + std::string(300, 'p');
    for (const char* path : {empty.c_str(), notNitf.c_str(), overlong.c_str(), "/nonexistent.ntf",
                             static_cast<const char*>(nullptr)}) {
        handle = FreshHandle();
        EXPECT_EQ(rh.open(&handle, path), 0);
        EXPECT_TRUE(handle.status == kHostStatus && handle.handler == nullptr && rh.isFormat(path) == 0) << path;
    }
    EXPECT_EQ(rh.open(nullptr, empty.c_str()), 0);
    const NitfFilePlan plan{true, false, {{std::string(100, 'x'), std::string(100, 'y')}}, {}, {}, {}, {}, {},
                            Tre("RPFHDR", std::string(48, '\0')), "", -1, -1};
    for (int fault = 0; fault < 3; ++fault) { // none, reversed, the file gone
        auto frame = std::make_unique<TempFile>(BuildNitfFile(plan), ".ntf");
        handle = FreshHandle();
        out = {};
        EXPECT_EQ(rh.open(&handle, frame->c_str()), 0);
        ASSERT_NE(handle.handler, nullptr);
        EXPECT_EQ(std::string(handle.path), frame->path());
        if (fault == 2)
            frame.reset();
        EXPECT_EQ(rh.startDraw(&handle, nullptr, fault == 1 ? reversed : rect, 1.5, &out.width), fault == 0 ? 1 : 0);
        if (fault > 0) {
            EXPECT_TRUE(handle.status == kStatusFailed && handle.handler == nullptr && handle.palette == nullptr &&
                        handle.geoRef == nullptr) << fault;
        } else { // the lines fail with status 0 and a buffer handed out; the draw ends twice
            EXPECT_TRUE(out.width == 100u && handle.status == kStatusOk);
            EXPECT_EQ(rh.getLine(&handle, 0, &out.row, &out.flag), 0);
            EXPECT_TRUE(handle.status == kStatusOk && out.row != nullptr && out.flag == 0);
            EXPECT_TRUE(rh.endDraw(&handle) + rh.endDraw(&handle) == 2 && handle.status == kStatusOk);
        }
        EXPECT_EQ(rh.close(&handle), 1);
        EXPECT_TRUE(handle.handler == nullptr && (fault > 0 || handle.status == kStatusOk)) << fault;
    }
}

} // namespace
