// Why the handler does not serve a file, in words: the one table from the
// library's Refusal to text, naming the first image's fields where they say
// what is not served.
#include "FileInfo.h"

#include "base/FileReader.h"
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"

#include <string>

namespace {

struct CodeName {
    const char* code;
    const char* name;
};
constexpr CodeName kCompressionNames[] = {{"C1", "bi-level"},      {"C2", "ARIDPCM"},      {"C3", "JPEG"},
                                          {"C4", "VQ"},            {"C5", "lossless JPEG"}, {"C8", "JPEG 2000"},
                                          {"I1", "downsampled JPEG"}};

// "C8 (JPEG 2000)"; a masked code ("M8") is named as its unmasked one.
std::string CompressionCode(const CNitfImage& image)
{
    const std::string code = PrintableText(image.IC, sizeof image.IC);
    const std::string unmasked = code.size() == 2 && code[0] == 'M' ? "C" + code.substr(1) : code;
    for (const CodeName& known : kCompressionNames)
        if (unmasked == known.code)
            return code + " (" + (code[0] == 'M' ? "masked " : "") + known.name + ")";
    return code;
}

const char* Words(Refusal why)
{
    switch (why) {
    case Refusal::kNone: return "served";
    case Refusal::kNoSuchFile: return "no such file";
    case Refusal::kNotRegularFile: return "not a regular file";
    case Refusal::kUnreadable: return "the file cannot be opened for reading";
    case Refusal::kNotNitf: return "not a NITF 2.0, 2.1 or NSIF 1.0 file (FHDR/FVER)";
    case Refusal::kFileLengthMismatch: return "FL matches the file's size at neither layout: cut short or padded";
    case Refusal::kHeaderFieldInvalid: return "a file header count or length is no number or runs past the file";
    case Refusal::kNoImage: return "the file has no image segment (NUMI 0)";
    case Refusal::kSubheaderInvalid: return "the first image subheader is cut short or a field of it is no number";
    case Refusal::kBandsInvalid: return "the first image's NBANDS, XBANDS or lookup tables do not fit the file";
    case Refusal::kMaskTableInvalid: return "the first image's mask table does not fit the file";
    case Refusal::kBlockGeometryInvalid: return "NROWS, NCOLS, NBPR, NBPC, NPPBH, NPPBV or IMODE are invalid";
    case Refusal::kDataOutsideFile: return "the image data runs past the end of the file";
    case Refusal::kUnservedCompression: return "compression IC {IC} is not served";
    case Refusal::kUnservedPixelType: return "pixel type PVTYPE {PVTYPE} is not served";
    case Refusal::kUnservedDepth: return "NBPP {NBPP} is not served for IREP {IREP} in IMODE {IMODE}";
    case Refusal::kUnservedRepresentation: return "IREP {IREP} with NBANDS {NBANDS} is not served";
    case Refusal::kCompressedDataInvalid:
        return "the IC {IC} data (NBPP {NBPP}, NBANDS {NBANDS}) is refused by its decoder";
    case Refusal::kRpfSectionMissing: return "an RPF section the frame needs is not in its location section";
    case Refusal::kRpfSectionInvalid: return "an RPF section is invalid or runs past the end of the file";
    case Refusal::kUnexpected: return "the open failed unexpectedly (memory may have run out)";
    }
    return "unknown";
}

void Fill(std::string& text, const std::string& name, const std::string& value)
{
    const std::string mark = "{" + name + "}";
    if (const size_t at = text.find(mark); at != std::string::npos)
        text.replace(at, mark.size(), value);
}

} // namespace

std::string RefusalText(Refusal why, const CNitfFileHeader& header)
{
    // The first image's fields as far as its subheader parses.
    CNitfImage image;
    CFileReader reader(0);
    reader.OpenFile(header.path.c_str(), kShareDenyWrite);
    image.ReadSubheader(reader, header);
    std::string text = Words(why);
    Fill(text, "IC", CompressionCode(image));
    for (const InfoField& field : ImageFields(image))
        Fill(text, field.name, field.text);
    image.Release();
    return text;
}
