// GeoTIFF output where libgeotiff is not built (the Windows host: libgeotiff
// needs PROJ, which is not cross-built). Every other output still works.
#include "GeoTiffWriter.h"

namespace host {

bool WriteGeoTiff(const std::string& path, const Raster& /*raster*/, const GeoReference* /*geo*/, std::string& message)
{
    message = "cannot write " + path + ": GeoTIFF output is not built into this host";
    return false;
}

} // namespace host
