// Why a file is not served: each validator that refuses a file records one
// of these, the caller naming which of its steps failed. The library keeps
// them for its tools (nitfinfo words them); no export carries them.
#pragma once

#include <cstdint>

enum class Refusal : uint8_t {
    kNone = 0,              // served
    kNoSuchFile,
    kNotRegularFile,        // a folder, a device
    kUnreadable,            // it could not be opened for reading
    kNotNitf,               // FHDR/FVER name no NITF 2.0, 2.1 or NSIF 1.0
    kFileLengthMismatch,    // FL matches the file's size at neither layout
    kHeaderFieldInvalid,    // a file header count or length is no number or runs past the file
    kNoImage,               // NUMI 0
    kSubheaderInvalid,      // the first image subheader is cut short or a field is no number
    kBandsInvalid,          // NBANDS / XBANDS or a band's lookup tables
    kMaskTableInvalid,
    kBlockGeometryInvalid,  // NROWS, NCOLS, NBPR, NBPC, NPPBH, NPPBV, IMODE
    kDataOutsideFile,       // image data the blocks address lies past the end of the file
    kUnservedCompression,   // IC
    kUnservedPixelType,     // PVTYPE R or C
    kUnservedDepth,         // NBPP
    kUnservedRepresentation, // IREP with its bands
    kCompressedDataInvalid, // the decoder's preparation refused the compressed data
    kRpfSectionMissing,     // a component the frame needs is not in its location section
    kRpfSectionInvalid,
    kUnexpected,            // a failure of no known cause (memory running out)
};

// Records why in refusal when ok is false; answers ok.
inline bool Check(bool ok, Refusal& refusal, Refusal why)
{
    if (!ok)
        refusal = why;
    return ok;
}

// Records why in refusal and answers false.
inline bool Refuse(Refusal& refusal, Refusal why)
{
    return Check(false, refusal, why);
}
