#include "plugin/RasterHandler.h"

#include "nitf/NitfFileHeader.h"
#include "plugin/FailureCodes.h"
#include "plugin/Palette.h"

#include <cstdlib>
#include <cstring>

namespace {

// Row buffer bytes per pixel: RPF rows are one byte per pixel (room for two),
// NITF rows up to three (red, green, blue).
constexpr size_t kRpfRowBytesPerPixel = 2;
constexpr size_t kNitfRowBytesPerPixel = 3;

// Test builds fill the row buffer with this before each line, so that a
// byte a line reported as decoded but never wrote shows as the pattern.
#ifdef VX_POISON_ROWS
constexpr uint8_t kPoisonByte = 0xA5;
#endif

} // namespace

void ReleaseHandleRecords(RHHandle* handle)
{
    DestroyPalette(handle->palette);
    handle->palette = nullptr;
    std::free(handle->geoRef);
    handle->geoRef = nullptr;
}

CRasterHandler::CRasterHandler(const char* filePath) : path(filePath != nullptr ? filePath : "") {}

CRasterHandler::~CRasterHandler()
{
    std::free(rowBuffer);
    rowBuffer = nullptr;
    fileReader.CloseFile();
    nitfImage.Release();
}

// The header step: parse the file header and choose the branch. Any failure
// leaves mode 0 and the handle untouched.
bool CRasterHandler::ReadHeader(CNitfFileHeader& header)
{
    try {
        header.SetPath(path.c_str());
        if (!header.Parse())
            throw kCodeHeaderParse;
        if (!Check(header.NUMI >= 1, header.refusal, Refusal::kNoImage))
            throw kCodeNoImage;
        mode = header.HasRpfHeader() ? kModeRpfFrame : kModeNitfImage;
        return true;
    } catch (...) {
        refusal = header.refusal;
        mode = kModeNone;
        header.Release();
        return false;
    }
}

void CRasterHandler::AttachTo(RHHandle* handle)
{
    handle->status = kStatusFailed;
    handle->openMarker = 0;
    handle->handler = this;
    handle->geoRef = nullptr;
    handle->palette = nullptr;
    // The path fits: the header step refuses paths the file reader cannot hold.
    std::memset(handle->path, 0, kHandlePathSize);
    std::strncpy(handle->path, path.c_str(), kHandlePathSize - 1);
}

int32_t CRasterHandler::OpenImage(RHHandle* handle)
{
    CNitfFileHeader header;
    if (!ReadHeader(header))
        return 0;
    // Its success is not tested here: a reader without a file reads nothing
    // and the branch's first read fails.
    CFileReader reader(0);
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    AttachTo(handle);
    // Failures raised by a branch pass to the export layer; the reader and
    // header are released on the way out.
    if (mode == kModeRpfFrame)
        return RpfOpen(handle, reader, header);
    return NitfOpen(handle, reader, header);
}

void CRasterHandler::DoStartDraw(const int32_t rect[4], uint32_t* rowWidth)
{
    std::memcpy(drawRect, rect, sizeof drawRect);
    const int64_t width = int64_t(drawRect[kRectEndColumn]) - int64_t(drawRect[kRectFirstColumn]);
    if (width < 0 || width > INT32_MAX)
        throw kCodeRowBuffer;
    *rowWidth = static_cast<uint32_t>(width);

    const size_t bytesPerPixel = mode == kModeRpfFrame ? kRpfRowBytesPerPixel : kNitfRowBytesPerPixel;
    std::free(rowBuffer); // a second draw start without a draw end replaces the buffer
    rowBufferBytes = width > 0 ? size_t(width) * bytesPerPixel : 1;
    rowBuffer = static_cast<uint8_t*>(std::malloc(rowBufferBytes));
    if (rowBuffer == nullptr)
        throw kCodeRowBuffer;

    fileReader.OpenFile(path.c_str(), kShareDenyWrite);
    if (fileReader.handle == kNoFile || fileReader.error == kSeekFailed)
        throw kCodeReopen;
    if (mode == kModeRpfFrame)
        RpfDrawStart(static_cast<int32_t>(width));
    else
        nitfImage.ReleaseBlockCache();
}

// Runs a draw step: success sets status 0; a code detaches the handler;
// anything else is recorded as unexpected with status 5.
template <typename Step>
int32_t CRasterHandler::RunDrawStep(RHHandle* handle, Step step)
{
    try {
        step();
        handle->status = kStatusOk;
        return 1;
    } catch (long code) {
        Detach(handle, code);
    } catch (...) {
        lastError = static_cast<int32_t>(kCodeUnexpected);
        handle->status = kStatusFailed;
    }
    return 0;
}

int32_t CRasterHandler::StartDraw(RHHandle* handle, const int32_t rect[4], uint32_t* rowWidth)
{
    return RunDrawStep(handle, [&] { DoStartDraw(rect, rowWidth); });
}

int32_t CRasterHandler::GetLine(RHHandle* handle, uint32_t row, uint8_t** rowAddress, uint16_t* lineFlag)
{
    try {
        const int32_t firstColumn = drawRect[kRectFirstColumn];
        const int64_t lastColumn = int64_t(drawRect[kRectEndColumn]) - 1;
        bool decoded = false;
        // Without a draw there is no buffer to fill: the line fails.
        if (rowBuffer != nullptr && lastColumn >= INT32_MIN) {
#ifdef VX_POISON_ROWS
            std::memset(rowBuffer, kPoisonByte, rowBufferBytes);
#endif
            const auto last = static_cast<int32_t>(lastColumn);
            decoded = mode == kModeRpfFrame ? RpfReadLine(fileReader, row, firstColumn, last, rowBuffer)
                                            : NitfReadLine(fileReader, row, firstColumn, last, rowBuffer);
        }
        *rowAddress = rowBuffer;
        *lineFlag = 0;
        handle->status = kStatusOk;
        return decoded ? 1 : 0;
    } catch (...) {
        lastError = static_cast<int32_t>(kCodeUnexpected);
        handle->status = kStatusFailed;
        return 0;
    }
}

void CRasterHandler::DoEndDraw()
{
    if (mode == kModeRpfFrame)
        RpfDrawEnd();
    else
        nitfImage.ReleaseBlockCache();
    fileReader.CloseFile();
    fileReader.handle = 0;
    fileReader.ResetState();
    std::free(rowBuffer);
    rowBuffer = nullptr;
    rowBufferBytes = 0;
}

int32_t CRasterHandler::EndDraw(RHHandle* handle)
{
    return RunDrawStep(handle, [&] { DoEndDraw(); });
}

void CRasterHandler::DoCloseImage(RHHandle* handle)
{
    if (mode != kModeRpfFrame)
        NitfClose();
    ReleaseHandleRecords(handle);
}

int32_t CRasterHandler::CloseImage(RHHandle* handle)
{
    try {
        DoCloseImage(handle);
        handle->status = kStatusOk;
        handle->handler = nullptr;
        return 1;
    } catch (long code) {
        Detach(handle, code);
    } catch (...) {
        Detach(handle, kCodeUnexpected);
    }
    return 0;
}

// A failure caught with a code separates the handler from the handle. The
// handle can no longer reach it, so the records it attached are released
// here and the export layer destroys the handler.
void CRasterHandler::Detach(RHHandle* handle, long code)
{
    lastError = static_cast<int32_t>(code);
    handle->status = kStatusFailed;
    handle->handler = nullptr;
    ReleaseHandleRecords(handle);
}
