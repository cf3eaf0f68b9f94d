// CRasterHandler: the library's per-file object. RH_Open creates one and hangs
// it on the host's RHHandle; every later export forwards to it; RH_Close
// destroys it. It decides between the RPF frame branch and the plain NITF
// branch and turns failures into the handle's status.
#pragma once

#include "nitf/NitfImage.h"
#include "base/FileReader.h"
#include "base/Refusal.h"
#include "plugin/HostRecords.h"
#include "rpf/RpfFrameReader.h"

#include <cstdint>
#include <string>

class CNitfFileHeader;

constexpr uint32_t kHandlerSignature = 0x0CACACAC;

enum HandlerMode : uint32_t {
    kModeNone = 0,      // no file identified
    kModeRpfFrame = 2,  // CADRG or CIB frame
    kModeNitfImage = 3, // plain NITF image
};

// Indices of the draw rectangle's four values as the host passes them.
constexpr int kRectFirstColumn = 0;
constexpr int kRectEndColumn = 2; // the column just past the rightmost

class CRasterHandler {
public:
    uint32_t signature = kHandlerSignature;
    std::string path;           // empty when RH_Open was given none
    uint8_t* rowBuffer = nullptr;
    size_t rowBufferBytes = 0;
    CRpfFrameReader rpfReader;
    CNitfImage nitfImage;
    int32_t drawRect[4] = {};
    CFileReader fileReader;
    int32_t lastError = 0;
    uint32_t mode = kModeNone;
    Refusal refusal = Refusal::kNone; // why OpenImage refused the file

    explicit CRasterHandler(const char* filePath);
    ~CRasterHandler();
    CRasterHandler(const CRasterHandler&) = delete;
    CRasterHandler& operator=(const CRasterHandler&) = delete;

    // Each operation reports 1 or 0 and sets the handle's status; failures
    // are caught here as the error model says, so none escapes.
    int32_t OpenImage(RHHandle* handle);
    int32_t StartDraw(RHHandle* handle, const int32_t rect[4], uint32_t* rowWidth);
    int32_t GetLine(RHHandle* handle, uint32_t row, uint8_t** rowAddress, uint16_t* lineFlag);
    int32_t EndDraw(RHHandle* handle);
    int32_t CloseImage(RHHandle* handle);

    // RPF frame branch.
    int32_t RpfOpen(RHHandle* handle, CFileReader& reader, const CNitfFileHeader& header);
    void RpfDrawStart(int32_t rowWidth);
    bool RpfReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn, uint8_t* rowBuffer);
    void RpfDrawEnd();

    // Plain NITF branch.
    int32_t NitfOpen(RHHandle* handle, CFileReader& reader, const CNitfFileHeader& header);
    bool NitfReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn, uint8_t* rowBuffer);
    void NitfClose();

private:
    bool ReadHeader(CNitfFileHeader& header);
    void AttachTo(RHHandle* handle);
    void DoStartDraw(const int32_t rect[4], uint32_t* rowWidth);
    void DoEndDraw();
    void DoCloseImage(RHHandle* handle);
    void Detach(RHHandle* handle, long code);
    template <typename Step>
    int32_t RunDrawStep(RHHandle* handle, Step step);
};

// Releases the palette and georeference record the open attached to a handle.
void ReleaseHandleRecords(RHHandle* handle);

// Why RH_Open would not serve the file at path (kNone: it would), found by
// the same open steps, without the exports. For the library's tools.
Refusal WhyRefused(const char* path);
