// What nitfinfo reports of one file: the NITF file header, the RPF frame
// name and the image subheaders as the library's parsers keep them, and
// whether the handler would open and serve the file, or why not.
#pragma once

#include "base/Refusal.h"

#include <string>
#include <vector>

// One reported value. Text is printable ASCII only (others become '?'),
// trailing blanks cut; numbers are decimal digits; a list holds names.
struct InfoField {
    enum Kind { kText, kNumber, kFlag, kList };
    std::string name;
    Kind kind = kText;
    std::string text;
    std::vector<std::string> items;
};
using InfoFields = std::vector<InfoField>;

struct FileInfo {
    std::string path;
    InfoFields header;              // FHDR, FTITLE, FSCLAS, NUMI, served, reason when not served
    InfoFields rpf;                 // empty unless the file header holds RPFHDR
    std::vector<InfoFields> images; // one per image segment
};

// Fills info for the file at path. False with a one-line reason when it is
// missing, a folder, unreadable or no NITF file.
bool DescribeFile(const std::string& path, FileInfo& info, std::string& reason);
class CNitfFileHeader;
class CNitfImage;
// The reported fields of a parsed image subheader.
InfoFields ImageFields(const CNitfImage& image);
// Why the handler does not serve the file of header, in words naming the first image's fields.
std::string RefusalText(Refusal why, const CNitfFileHeader& header);
// The field's bytes as printable text: others replaced by '?', trailing blanks cut.
std::string PrintableText(const char* field, size_t width);
// Names of the tagged record extensions (CETAG) in UDID or IXSHD data, up to the first malformed one.
std::vector<std::string> ExtensionTags(const std::vector<uint8_t>& data);
// What the frame file name says (fffffvvp.ssz): series code, its chart and scale when known, zone, producer.
InfoFields FrameNameFields(const std::string& fileName);

void PrintText(const FileInfo& info, std::string& out);
// One JSON object; every string escaped.
void PrintJson(const FileInfo& info, std::string& out);
