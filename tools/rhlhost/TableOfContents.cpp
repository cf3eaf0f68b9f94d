#include "TableOfContents.h"

#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>

namespace host {
namespace {

// A table of contents lists frames in 33-byte records: even a library of a
// million frames stays far below this.
constexpr uint64_t kMaxTocBytes = uint64_t(64) << 20;

constexpr size_t kHeaderSectionSize = 48;
constexpr size_t kHeaderLocationField = 44; // location section location
constexpr size_t kLocationSectionSize = 14;
constexpr size_t kLocationRecordSize = 10;
constexpr size_t kRectangleSubheaderSize = 8;
constexpr size_t kRectangleRecordSize = 132;
constexpr size_t kFrameIndexSubheaderSize = 13;
constexpr size_t kFrameRecordSize = 33;
constexpr size_t kFrameFileNameSize = 12;

constexpr uint16_t kRectangleSubheaderId = 148;
constexpr uint16_t kRectangleTableId = 149;
constexpr uint16_t kFrameIndexSubheaderId = 150;
constexpr uint16_t kFrameIndexTableId = 151;

// The file in memory, read in the byte order its RPF header section names.
// Every read is preceded by a Holds check of its whole span.
class TocBytes {
public:
    std::string bytes;
    bool bigEndian = true;

    bool Holds(uint64_t offset, uint64_t length) const
    {
        return offset <= bytes.size() && length <= bytes.size() - offset;
    }
    uint64_t Number(uint64_t at, unsigned width) const
    {
        uint64_t value = 0;
        for (unsigned i = 0; i < width; ++i) {
            const uint8_t byte = uint8_t(bytes[at + (bigEndian ? i : width - 1 - i)]);
            value = value << 8 | byte;
        }
        return value;
    }
    uint16_t U16(uint64_t at) const { return uint16_t(Number(at, 2)); }
    uint32_t U32(uint64_t at) const { return uint32_t(Number(at, 4)); }
    double F64(uint64_t at) const
    {
        const uint64_t raw = Number(at, 8);
        double value;
        std::memcpy(&value, &raw, sizeof value);
        return value;
    }
    // A BCS-A field without its trailing spaces; bytes outside printable ASCII become '?'.
    std::string Text(uint64_t at, size_t length) const
    {
        std::string text = bytes.substr(at, length);
        for (char& c : text)
            if (c < ' ' || c > '~')
                c = '?';
        return text.substr(0, text.find_last_not_of(' ') + 1);
    }
};

// A section named in the location section: its span lies within the file.
struct Component {
    uint64_t location = 0, length = 0;
    bool found = false;
    bool Holds(uint64_t offset, uint64_t size) const { return offset <= length && size <= length - offset; }
};

bool Refuse(std::string& message, const std::string& reason)
{
    message = reason;
    return false;
}

bool ReadFileBytes(const std::string& path, std::string& bytes, std::string& message)
{
    std::error_code error;
    const uintmax_t size = std::filesystem::file_size(path, error);
    if (error)
        return Refuse(message, "cannot read it: " + error.message());
    if (size > kMaxTocBytes)
        return Refuse(message, "larger than a table of contents may be (" + std::to_string(size) + " bytes)");
    std::ifstream in(path, std::ios::binary);
    bytes.resize(size_t(size));
    if (!in.read(&bytes[0], std::streamsize(size)))
        return Refuse(message, "cannot read it");
    return true;
}

// The RPF header section lies at the start of a bare A.TOC, or is the data
// of the RPFHDR TRE in the user-defined header data of an NITF file header.
bool FindHeaderSection(TocBytes& file, uint64_t& at, std::string& message)
{
    at = 0;
    if (file.bytes.compare(0, 4, "NITF") == 0 || file.bytes.compare(0, 4, "NSIF") == 0) {
        const std::string tag = "RPFHDR00048";
        const size_t found = file.bytes.find(tag);
        if (found == std::string::npos)
            return Refuse(message, "an NITF file without an RPFHDR TRE");
        at = found + tag.size();
    }
    if (!file.Holds(at, kHeaderSectionSize))
        return Refuse(message, "the RPF header section is cut short");
    const uint8_t endian = uint8_t(file.bytes[at]);
    if (endian != 0x00 && endian != 0xFF)
        return Refuse(message, "not an RPF table of contents (no endian indicator)");
    file.bigEndian = endian == 0x00;
    if (file.U16(at + 1) != kHeaderSectionSize)
        return Refuse(message, "not an RPF table of contents (header section length)");
    return true;
}

// Finds components 148 to 151 through the location section.
bool ReadLocations(const TocBytes& file, uint64_t header, Component (&components)[4], std::string& message)
{
    const uint64_t section = file.U32(header + kHeaderLocationField);
    if (!file.Holds(section, kLocationSectionSize))
        return Refuse(message, "the location section lies outside the file");
    const uint64_t table = section + file.U32(section + 2);
    const uint16_t count = file.U16(section + 6);
    const uint16_t recordLength = file.U16(section + 8);
    if (recordLength < kLocationRecordSize || !file.Holds(table, uint64_t(count) * recordLength))
        return Refuse(message, "the component location records lie outside the file");
    for (uint16_t i = 0; i < count; ++i) {
        const uint64_t record = table + uint64_t(i) * recordLength;
        const uint16_t id = file.U16(record);
        if (id < kRectangleSubheaderId || id > kFrameIndexTableId)
            continue;
        Component& component = components[id - kRectangleSubheaderId];
        component = {file.U32(record + 6), file.U32(record + 2), true};
        if (!file.Holds(component.location, component.length))
            return Refuse(message, "component " + std::to_string(id) + " lies outside the file");
    }
    for (uint16_t id = kRectangleSubheaderId; id <= kFrameIndexTableId; ++id)
        if (!components[id - kRectangleSubheaderId].found)
            return Refuse(message, "no component " + std::to_string(id) + " in the location section");
    return true;
}

// The boundary rectangle records, where component 149 lies (the subheader's
// table offset is not needed to find them).
bool ReadRectangles(const TocBytes& file, const Component& subheader, const Component& table, TableOfContents& toc,
                    std::string& message)
{
    if (!subheader.Holds(0, kRectangleSubheaderSize))
        return Refuse(message, "the boundary rectangle section subheader is cut short");
    const uint16_t count = file.U16(subheader.location + 4);
    const uint16_t recordLength = file.U16(subheader.location + 6);
    if (recordLength < kRectangleRecordSize || !table.Holds(0, uint64_t(count) * recordLength))
        return Refuse(message, "the boundary rectangle records lie outside their section");
    for (uint16_t i = 0; i < count; ++i) {
        const uint64_t at = table.location + uint64_t(i) * recordLength;
        TocRectangle r;
        r.productType = file.Text(at, 5);
        r.compression = file.Text(at + 5, 5);
        r.scale = file.Text(at + 10, 12);
        const std::string zone = file.Text(at + 22, 1);
        r.zone = zone.empty() ? ' ' : zone[0];
        r.producer = file.Text(at + 23, 5);
        r.northWestLatitude = file.F64(at + 28);
        r.northWestLongitude = file.F64(at + 36);
        r.southEastLatitude = file.F64(at + 76);
        r.southEastLongitude = file.F64(at + 84);
        r.frameRows = file.U32(at + 124);
        r.frameColumns = file.U32(at + 128);
        toc.rectangles.push_back(r);
    }
    return true;
}

// The frame file index records; each names its path name record by an
// offset from the start of component 151, within it.
bool ReadFrames(const TocBytes& file, const Component& subheader, const Component& table, TableOfContents& toc,
                std::string& message)
{
    if (!subheader.Holds(0, kFrameIndexSubheaderSize))
        return Refuse(message, "the frame file index section subheader is cut short");
    const uint32_t count = file.U32(subheader.location + 5);
    const uint16_t recordLength = file.U16(subheader.location + 11);
    if (recordLength < kFrameRecordSize || !table.Holds(0, uint64_t(count) * recordLength))
        return Refuse(message, "the frame file index records lie outside their section");
    toc.frames.reserve(count);
    for (uint32_t i = 0; i < count; ++i) {
        const uint64_t at = table.location + uint64_t(i) * recordLength;
        TocFrame frame{file.U16(at), file.U16(at + 2), file.U16(at + 4), {}};
        const uint64_t pathRecord = file.U32(at + 6);
        if (!table.Holds(pathRecord, 2) || !table.Holds(pathRecord + 2, file.U16(table.location + pathRecord)))
            return Refuse(message, "frame file " + std::to_string(i + 1) + ": its path name lies outside its section");
        if (frame.rectangle >= toc.rectangles.size())
            return Refuse(message, "frame file " + std::to_string(i + 1) + " names no boundary rectangle");
        TocRectangle& rectangle = toc.rectangles[frame.rectangle];
        if (frame.row >= rectangle.frameRows || frame.column >= rectangle.frameColumns)
            return Refuse(message, "frame file " + std::to_string(i + 1) + " lies outside its boundary rectangle");
        frame.path = file.Text(table.location + pathRecord + 2, file.U16(table.location + pathRecord)) +
                     file.Text(at + 10, kFrameFileNameSize);
        ++rectangle.framesListed;
        toc.frames.push_back(std::move(frame));
    }
    return true;
}

void PrintCorner(const char* name, double latitude, double longitude)
{
    std::printf("  %-11s latitude %.9f  longitude %.9f\n", name, latitude, longitude);
}

} // namespace

bool ReadTableOfContents(const std::string& path, TableOfContents& toc, std::string& message)
{
    TocBytes file;
    uint64_t header = 0;
    Component components[4];
    return ReadFileBytes(path, file.bytes, message) && FindHeaderSection(file, header, message) &&
           ReadLocations(file, header, components, message) &&
           ReadRectangles(file, components[0], components[1], toc, message) &&
           ReadFrames(file, components[2], components[3], toc, message);
}

void PrintTableOfContents(const std::string& path, const TableOfContents& toc)
{
    std::printf("%s: %zu boundary rectangles, %zu frame files\n", path.c_str(), toc.rectangles.size(),
                toc.frames.size());
    for (size_t i = 0; i < toc.rectangles.size(); ++i) {
        const TocRectangle& r = toc.rectangles[i];
        std::printf("product %-4zu %s %s %s zone %c, producer %s\n", i + 1, r.productType.c_str(),
                    r.compression.c_str(), r.scale.c_str(), r.zone, r.producer.c_str());
        PrintCorner("north-west", r.northWestLatitude, r.northWestLongitude);
        PrintCorner("south-east", r.southEastLatitude, r.southEastLongitude);
        std::printf("  %-11s %u x %u (rows x columns), %zu listed\n", "frames", r.frameRows, r.frameColumns,
                    r.framesListed);
    }
}

} // namespace host
