// The RPF table of contents (A.TOC) of a CADRG or CIB product: its boundary
// rectangles and the frame files each holds. Read here, in the host, from the
// file's own bytes: the handler reads frames, not tables of contents.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace host {

// Every RPF frame is this many pixels on a side.
constexpr uint32_t kRpfFramePixels = 1536;

// One boundary rectangle record (component 149): one product of the
// exchange, a grid of frames of one scale in one zone.
struct TocRectangle {
    std::string productType; // "CADRG", "CIB"
    std::string compression; // "55:1"
    std::string scale;       // "1:1,000,000" or a CIB resolution "10M"
    char zone = ' ';         // '1' to '9', 'A' to 'J'; '9' and 'J' are the polar zones
    std::string producer;
    double northWestLatitude = 0, northWestLongitude = 0;
    double southEastLatitude = 0, southEastLongitude = 0;
    uint32_t frameRows = 0, frameColumns = 0;
    size_t framesListed = 0; // frame file index records naming this rectangle

    bool Polar() const { return zone == '9' || zone == 'J'; }
};

// One frame file index record (component 151).
struct TocFrame {
    size_t rectangle = 0;  // index into TableOfContents::rectangles
    uint32_t row = 0;      // frame row, 0 the southernmost
    uint32_t column = 0;   // frame column, 0 the westernmost
    std::string path;      // the path name record and the frame file name, relative to the A.TOC's folder
};

struct TableOfContents {
    std::vector<TocRectangle> rectangles;
    std::vector<TocFrame> frames;
};

// Reads an A.TOC, bare or behind an NITF file header; false with a message
// when a section, record or name lies outside the file or names a rectangle,
// row or column that does not exist.
bool ReadTableOfContents(const std::string& path, TableOfContents& toc, std::string& message);

// The rectangles for people, one block each, numbered from 1.
void PrintTableOfContents(const std::string& path, const TableOfContents& toc);

} // namespace host
