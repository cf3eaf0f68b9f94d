#include "imaging/LeadToolLibWrapper.h"

const char* const kReinitialisedText =
    "CLeadToolLibWrapper::openJPEGBitmap. Non sunctioned re initialization of BITMAPHANDLE array!";
const char* const kDamagedImageText = "CLeadToolLibWrapper::openJPEGBitmap. Multi block image is damaged!";
const char* const kOutOfMemoryText = "CLeadToolLibWrapper::openJPEGBitmap. Not enough memory for image displaying!";

CLeadToolLibWrapper::CLeadToolLibWrapper() : tiffHeader{} {}
CLeadToolLibWrapper::~CLeadToolLibWrapper() {}
bool CLeadToolLibWrapper::PrepareBiLevel() { return false; }
bool CLeadToolLibWrapper::PrepareJpeg(CFileReader&, uint32_t, uint32_t, uint32_t) { return false; }
bool CLeadToolLibWrapper::Open(CFileReader&, uint32_t, uint32_t, uint32_t, uint32_t, uint32_t, uint32_t, uint32_t,
                               bool, uint32_t, uint32_t) { return false; }
bool CLeadToolLibWrapper::GetRow(uint32_t, uint32_t, uint32_t, uint32_t, uint32_t, uint8_t*) { return false; }
void CLeadToolLibWrapper::FreeBitmaps() {}
