#include "plugin/FormatProbe.h"

#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "plugin/FailureCodes.h"
#include "base/FileReader.h"

bool ProbeFormat(const char* path)
{
    // The codes only select the answer no; the header, reader and image are
    // released by their destructors on every way out.
    try {
        CNitfFileHeader header;
        header.SetPath(path);
        if (!header.Parse())
            throw kCodeHeaderParse;
        if (header.NUMI < 1)
            throw kCodeNoImage;
        if (header.HasRpfHeader())
            return true;

        CFileReader reader(0);
        reader.OpenFile(path, kShareDenyWrite);
        CNitfImage image;
        if (!image.ReadSubheader(reader, header))
            throw kCodeSubheader;
        if (!image.PrepareData(reader, header.imageSegments[0].dataLength))
            throw kCodePrepare;
        image.Release();
        return true;
    } catch (...) {
        return false;
    }
}
