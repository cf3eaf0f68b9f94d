// GeoTIFF output where libgeotiff is not built (the Windows host: libgeotiff
// needs PROJ, which is not cross-built). Every other output still works.
#include "GeoTiffWriter.h"

namespace host {

struct GeoTiffWriter::Levels {};

GeoTiffWriter::GeoTiffWriter(const std::string& /*path*/, const Raster& /*raster*/, const GeoReference* /*geo*/,
                             bool /*overviews*/)
{
}

GeoTiffWriter::~GeoTiffWriter() = default;

bool GeoTiffWriter::Open(std::string& message)
{
    message = "GeoTIFF output is not built into this host";
    return false;
}

bool GeoTiffWriter::AddRow(const uint8_t* /*row*/, std::string& message)
{
    return Open(message);
}

bool GeoTiffWriter::Finish(std::string& message)
{
    return Open(message);
}

} // namespace host
