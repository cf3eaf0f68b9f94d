// RPF frame branch: not served yet; the open reports failure.
#include "plugin/RasterHandler.h"

int32_t CRasterHandler::RpfOpen(RHHandle*, CFileReader&, const CNitfFileHeader&) { return 0; }
void CRasterHandler::RpfDrawStart(int32_t) {}
bool CRasterHandler::RpfReadLine(CFileReader&, uint32_t, int32_t, int32_t, uint8_t*) { return false; }
void CRasterHandler::RpfDrawEnd() {}
