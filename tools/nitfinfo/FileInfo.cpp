#include "FileInfo.h"

#include "base/FieldNumbers.h"
#include "base/FileReader.h"
#include "nitf/NitfFileHeader.h"
#include "nitf/NitfImage.h"
#include "plugin/RasterHandler.h"
#include "rpf/RpfHeaderSection.h"

#include <cctype>
#include <cstring>
#include <filesystem>

namespace {

// Fields of CNitfImage::subheaderText, which holds IM..ICORDS at their NITF 2.1
// positions whichever the version (the NITF 2.0 ISDEVT is skipped).
struct TextPlace {
    const char* name;
    unsigned position, width;
};
constexpr TextPlace kImageTextFields[] = {
    {"IID1", 2, 10}, {"IDATIM", 12, 14}, {"ICAT", 360, 8}, {"ISORCE", 291, 42}, {"PVTYPE", 349, 3}};
constexpr unsigned kIrepWidth = 8;
constexpr unsigned kTagWidth = 6;    // CETAG
constexpr unsigned kLengthWidth = 5; // CEL
// The 48 bytes of the RPF header section follow UDHOFL (3), CETAG (6) and CEL (5).
constexpr uint64_t kRpfHeaderDataOffset = 14;

struct SeriesCode {
    const char* code;
    const char* series;
};
// The chart and image series of MIL-STD-2411 frame file names this tool names.
constexpr SeriesCode kSeriesCodes[] = {
    {"GN", "GNC 1:5,000,000"}, {"JN", "JNC 1:2,000,000"}, {"ON", "ONC 1:1,000,000"}, {"TP", "TPC 1:500,000"},
    {"JG", "JOG 1:250,000"},   {"I1", "CIB 10 m"},        {"I2", "CIB 5 m"},         {"I3", "CIB 2 m"},
    {"I4", "CIB 1 m"},         {"I5", "CIB 0.5 m"},
};

InfoField Text(const char* name, const std::string& text)
{
    return {name, InfoField::kText, text, {}};
}

InfoField Field(const char* name, const char* field, size_t width)
{
    return Text(name, PrintableText(field, width));
}

InfoField Number(const char* name, int64_t value)
{
    return {name, InfoField::kNumber, std::to_string(value), {}};
}

InfoField Flag(const char* name, bool value)
{
    return {name, InfoField::kFlag, value ? "true" : "false", {}};
}

bool IsUncompressedCode(const char IC[2])
{
    return IC[0] == 'N' && (IC[1] == 'C' || IC[1] == 'M');
}

} // namespace

InfoFields ImageFields(const CNitfImage& image)
{
    InfoFields fields;
    for (const TextPlace& place : kImageTextFields)
        fields.push_back(Field(place.name, image.subheaderText + place.position, place.width));
    fields.push_back(Field("IC", image.IC, sizeof image.IC));
    if (!IsUncompressedCode(image.IC))
        fields.push_back(Field("COMRAT", image.COMRAT, sizeof image.COMRAT));
    fields.push_back(Field("IREP", image.IREP(), kIrepWidth));
    const char IMODE = image.IMODE();
    fields.push_back(Field("IMODE", &IMODE, 1));
    for (const auto& [name, value] : {std::pair{"NBPP", image.NBPP}, {"ABPP", image.ABPP}, {"NROWS", image.NROWS},
                                      {"NCOLS", image.NCOLS}, {"NPPBH", image.NPPBH}, {"NPPBV", image.NPPBV},
                                      {"NBPR", image.NBPR}, {"NBPC", image.NBPC}, {"NBANDS", image.NBANDS}})
        fields.push_back(Number(name, value));
    const char ICORDS = image.ICORDS();
    fields.push_back(Field("ICORDS", &ICORDS, 1));
    if (image.IGEOLO)
        fields.push_back(Field("IGEOLO", image.IGEOLO.get(), kIgeoloSize));
    InfoField tags{"TREs", InfoField::kList, "", ExtensionTags(image.UDID)};
    for (const std::string& tag : ExtensionTags(image.IXSHD))
        tags.items.push_back(tag);
    fields.push_back(tags);
    return fields;
}

namespace {

// Every image segment's subheader, found after the segments before it (LISH + LI each).
void DescribeImages(const CNitfFileHeader& header, FileInfo& info)
{
    CFileReader reader(0);
    reader.OpenFile(header.path.c_str(), kShareDenyWrite);
    uint64_t offset = header.HL;
    for (int32_t i = 0; i < header.NUMI; ++i) {
        const NitfSegmentLength& segment = header.imageSegments[i];
        CNitfImage image;
        image.version21 = header.version21;
        image.subheaderLength = segment.subheaderLength;
        const bool parsed = offset <= UINT32_MAX && image.ReadSubheader(reader, uint32_t(offset));
        info.images.push_back(parsed ? ImageFields(image) : InfoFields{});
        info.images.back().insert(info.images.back().begin(), Flag("parsed", parsed));
        image.Release();
        // Segment lengths come from 6 and 10 digits: their sum cannot overflow 64 bits.
        offset += segment.subheaderLength + segment.dataLength;
    }
}

void DescribeRpfFrame(const CNitfFileHeader& header, FileInfo& info)
{
    info.rpf = FrameNameFields(std::filesystem::path(info.path).filename().string());
    CFileReader reader(0);
    reader.OpenFile(header.path.c_str(), kShareDenyWrite);
    RpfHeaderSection section;
    if (section.ReadHeaderSection(reader, uint64_t(header.userHeaderOffset) + kRpfHeaderDataOffset))
        info.rpf.push_back(Field("FILENAME", section.fileName, std::strlen(section.fileName)));
}

} // namespace

std::string PrintableText(const char* field, size_t width)
{
    std::string text(field, width);
    for (char& c : text)
        if (c < 0x20 || c > 0x7E)
            c = '?';
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

std::vector<std::string> ExtensionTags(const std::vector<uint8_t>& data)
{
    std::vector<std::string> tags;
    size_t at = 0;
    while (data.size() - at >= kTagWidth + kLengthWidth) {
        const char* record = reinterpret_cast<const char*>(data.data() + at);
        for (unsigned i = kTagWidth; i < kTagWidth + kLengthWidth; ++i)
            if (record[i] < '0' || record[i] > '9')
                return tags;
        const size_t length = size_t(FieldToLong(record + kTagWidth, kLengthWidth));
        if (length > data.size() - at - kTagWidth - kLengthWidth)
            return tags;
        tags.push_back(PrintableText(record, kTagWidth));
        at += kTagWidth + kLengthWidth + length;
    }
    return tags;
}

InfoFields FrameNameFields(const std::string& fileName)
{
    InfoFields fields{Text("name", PrintableText(fileName.data(), fileName.size()))};
    // fffff (frame number), vv (version), p (producer) . ss (series), z (zone)
    if (fileName.size() != 12 || fileName[8] != '.')
        return fields;
    std::string code = fileName.substr(9, 2);
    for (char& c : code)
        c = char(std::toupper(static_cast<unsigned char>(c)));
    fields.push_back(Field("code", code.data(), code.size()));
    for (const SeriesCode& known : kSeriesCodes)
        if (code == known.code)
            fields.push_back(Text("series", known.series));
    fields.push_back(Field("zone", &fileName[11], 1));
    fields.push_back(Field("producer", &fileName[7], 1));
    return fields;
}

bool DescribeFile(const std::string& path, FileInfo& info, std::string& reason)
{
    // Served: RH_Open's steps would open the file and serve it.
    const Refusal refusal = WhyRefused(path.c_str());
    CNitfFileHeader header;
    header.SetPath(path.c_str());
    // A file missing, not a regular file or without a NITF file header is not described.
    if (refusal == Refusal::kNoSuchFile || refusal == Refusal::kNotRegularFile || !header.Parse()) {
        reason = RefusalText(refusal, header);
        return false;
    }
    info.path = path;
    info.header = {Field("FHDR", header.headerText, 9), Field("FTITLE", header.FTITLE(), header.kFtitleWidth)};
    const char FSCLAS = header.FSCLAS();
    info.header.push_back(Field("FSCLAS", &FSCLAS, 1));
    info.header.push_back(Number("NUMI", header.NUMI));
    info.header.push_back(Flag("served", refusal == Refusal::kNone));
    if (refusal != Refusal::kNone)
        info.header.push_back(Text("reason", RefusalText(refusal, header)));
    if (header.HasRpfHeader())
        DescribeRpfFrame(header, info);
    DescribeImages(header, info);
    return true;
}
