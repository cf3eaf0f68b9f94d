// The whole export sequence on one input file, as a host drives it: probe, open, one draw over the full width, every
// row up to a pixel budget, end of draw, close. The exports are linked in, not loaded.
#include "FuzzFile.h"
#include "plugin/HostRecords.h"

#include <algorithm>
#include <string>

extern "C" {
int32_t RH_IsFormat(const char* path);
int32_t RH_Open(RHHandle* handle, const char* path);
int32_t RH_StartDraw(RHHandle* handle, void* hostContext, const int32_t* rect, double scale, uint32_t* rowWidth);
int32_t RH_GetLine(RHHandle* handle, uint32_t row, uint8_t** rowAddress, uint16_t* lineFlag);
int32_t RH_EndDraw(RHHandle* handle);
int32_t RH_Close(RHHandle* handle);
}

constexpr uint64_t kPixelBudget = 1u << 18; // pixels drawn per input
constexpr uint32_t kMaxRows = 4096, kReverseRows = 64;
constexpr uint32_t kFailedOpenSide = 64; // the span drawn on a handle whose open failed

// Rows firstRow, firstRow + step, ... of columns [firstColumn, endColumn), while the pixel budget lasts.
static void DrawSpan(RHHandle& handle, int32_t firstColumn, int32_t endColumn, uint32_t firstRow, uint32_t height,
                     int32_t step)
{
    const int32_t rect[4] = {firstColumn, int32_t(firstRow), endColumn, int32_t(std::min<uint32_t>(height, INT32_MAX))};
    uint32_t rowWidth = 0;
    if (RH_StartDraw(&handle, nullptr, rect, 1.0, &rowWidth) != 1)
        return;
    const uint64_t budgetRows = kPixelBudget / std::max<uint32_t>(rowWidth, 1);
    const uint32_t rows = uint32_t(std::min<uint64_t>({height, budgetRows, kMaxRows}));
    const size_t rowBytes = size_t(rowWidth) * (handle.pixelKind == kPixelDirect ? 3 : 1);
    volatile uint8_t sink = 0;
    int64_t row = firstRow;
    for (uint32_t n = 0; n < rows && handle.handler != nullptr; ++n, row += step) {
        uint8_t* address = nullptr;
        uint16_t flag = 0;
        if (RH_GetLine(&handle, uint32_t(row), &address, &flag) == 1 && address != nullptr && rowBytes > 0)
            sink = sink ^ address[0] ^ address[rowBytes - 1]; // the whole row must be addressable
    }
    if (handle.handler != nullptr)
        RH_EndDraw(&handle);
}

// The full width from the top, then an inner span from the bottom row up
// (hosts ask for rows in any order), then a span that starts left of the image.
static void Draw(RHHandle& handle)
{
    const bool described = handle.status == kStatusOk;
    const uint32_t width = described ? handle.width : kFailedOpenSide;
    const uint32_t height = described ? handle.height : kFailedOpenSide;
    if (width > uint32_t(INT32_MAX) || height == 0)
        return;
    const auto end = int32_t(width);
    DrawSpan(handle, 0, end, 0, height, 1); // a draw that detached the handler leaves the next ones to fail
    DrawSpan(handle, end / 3, end - end / 5, height - 1, std::min<uint32_t>(height, kReverseRows), -1);
    DrawSpan(handle, -3, std::min(end, 5), 0, 1, 1);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    std::basic_string<uint8_t> input(data, size);
    DeclareInputLength(input.data(), input.size());
    if (!WriteFuzzFile(input.data(), input.size()))
        return 0;
    const char* path = FuzzFilePath().c_str();
    RH_IsFormat(path);

    RHHandle handle{};
    RH_Open(&handle, path);
    if (handle.handler == nullptr)
        return 0;
    volatile uint8_t last = 0; // the whole palette must be addressable
    if (handle.palette != nullptr && handle.palette->entryCount > 0)
        last = last ^ handle.palette->entries[size_t(handle.palette->entryCount) * 3 - 1];
    // A host may draw a handle whose open failed but left the handler attached (status 5): that must fail cleanly too.
    Draw(handle);
    RH_Close(&handle);
    return 0;
}
