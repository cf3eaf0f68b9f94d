// Plain NITF branch: not served yet; the open reports failure.
#include "plugin/RasterHandler.h"

int32_t CRasterHandler::NitfOpen(RHHandle*, CFileReader&, const CNitfFileHeader&) { return 0; }
bool CRasterHandler::NitfReadLine(CFileReader&, uint32_t, int32_t, int32_t, uint8_t*) { return false; }
void CRasterHandler::NitfClose() {}
