#include "nitf/NitfFileHeader.h"

#include "base/CheckedRead.h"
#include "base/FieldNumbers.h"

#include <cstring>
#include <new>
#include <strings.h>

namespace {

constexpr uint64_t kFixedLengthOffset = 342;   // FL in NITF 2.1 and NITF 2.0 without FSDEVT
constexpr uint64_t kShiftedLengthOffset = 382; // FL in NITF 2.0 whose FSDWNG is 999998
constexpr unsigned kFileLengthWidth = 12;
constexpr unsigned kHeaderLengthWidth = 6;
constexpr unsigned kCountWidth = 3;
constexpr unsigned kDataLengthWidth = 5;       // UDHDL, XHDL
constexpr unsigned kOverflowWidth = 3;         // UDHOFL, XHDLOFL
// The length of the RPFHDR user-defined data: UDHOFL, tag, length and 48 bytes of header.
constexpr int32_t kRpfUserHeaderLength = 62;
constexpr char kRpfHeaderTag[] = "RPFHDR";

// FHDR and FVER as "NITF02.10" names them; the character between FVER's
// digits is not checked.
bool VersionIs(const char* text, const char* version)
{
    return std::memcmp(text, version, 6) == 0 && std::memcmp(text + 7, version + 7, 2) == 0;
}

struct SegmentGroupLayout {
    unsigned subheaderWidth;
    unsigned dataWidth;
};

// Reads FL (12 digits, wide enough for any file size) and HL at offset.
// False when they are not in the file or FL is not all digits.
bool ReadFileLengths(FileCursor& cursor, uint64_t offset, char* lengthText, uint64_t& fileLength,
                     uint32_t& headerLength)
{
    if (!cursor.SeekTo(offset) || !cursor.Read(lengthText, kFileLengthWidth + kHeaderLengthWidth))
        return false;
    fileLength = 0;
    for (unsigned i = 0; i < kFileLengthWidth; ++i) {
        char digit = lengthText[i];
        if (digit < '0' || digit > '9')
            return false;
        fileLength = fileLength * 10 + static_cast<uint64_t>(digit - '0');
    }
    int32_t declaredHeaderLength = FieldToLong(lengthText + kFileLengthWidth, kHeaderLengthWidth);
    headerLength = declaredHeaderLength > 0 ? static_cast<uint32_t>(declaredHeaderLength) : 0;
    return true;
}

// True when the FL found at offset matches the file's size.
bool FileLengthMatchesAt(FileCursor& cursor, uint64_t offset, uint64_t fileSize, char* lengthText,
                         uint32_t& headerLength)
{
    uint64_t declaredLength = 0;
    return ReadFileLengths(cursor, offset, lengthText, declaredLength, headerLength) && declaredLength == fileSize;
}

// Reads one count field and its length pairs; a count of 0 leaves the list null.
bool ReadSegmentGroup(FileCursor& cursor, SegmentGroupLayout layout, int32_t& count, NitfSegmentLength*& list)
{
    if (!cursor.Number(kCountWidth, count) || count < 0)
        return false;
    if (count == 0)
        return true;
    list = new NitfSegmentLength[static_cast<size_t>(count)];
    for (int32_t i = 0; i < count; ++i) {
        int32_t subheaderLength = 0;
        int64_t dataLength = 0;
        if (!cursor.Number(layout.subheaderWidth, subheaderLength) ||
            !cursor.Number(layout.dataWidth, dataLength) || subheaderLength < 0 || dataLength < 0)
            return false;
        list[i] = {static_cast<uint32_t>(subheaderLength), static_cast<uint64_t>(dataLength)};
    }
    return true;
}

// Reads UDHDL/XHDL with its overflow field and data. The length counts the
// 3-character overflow field, so 1 and 2 cannot be right; data running past
// the end of the file is refused before anything is allocated.
bool ReadHeaderData(FileCursor& cursor, int32_t& length, int32_t& overflow, uint8_t*& data)
{
    if (!cursor.Number(kDataLengthWidth, length) || length < 0)
        return false;
    if (length == 0)
        return true;
    if (length < static_cast<int32_t>(kOverflowWidth) || static_cast<uint64_t>(length) > cursor.Remaining())
        return false;
    if (!cursor.Number(kOverflowWidth, overflow))
        return false;
    uint32_t dataLength = static_cast<uint32_t>(length) - kOverflowWidth;
    data = new uint8_t[dataLength > 0 ? dataLength : 1];
    return cursor.Read(data, dataLength);
}

} // namespace

void CNitfFileHeader::SetPath(const char* filePath)
{
    path = filePath != nullptr ? filePath : "";
}

bool CNitfFileHeader::Parse()
{
    refusal = Refusal::kNone;
    try {
        CFileReader reader(0);
        reader.OpenFile(path.c_str(), kShareDenyWrite);
        if (path.empty() || !reader.HoldsFile())
            return Refuse(refusal, Refusal::kUnreadable);
        uint64_t fileSize = reader.FileSize();
        FileCursor cursor(reader, fileSize);

        // The whole front is read at once: a file shorter than it has no FL anyway.
        if (!cursor.Read(headerText, sizeof headerText))
            return Refuse(refusal, Refusal::kNotNitf);
        // NSIF 1.0 is laid out as NITF 2.1.
        if (VersionIs(headerText, "NITF02.10") || VersionIs(headerText, "NSIF01.00"))
            version21 = 1;
        else if (VersionIs(headerText, "NITF02.00"))
            version21 = 0;
        else
            return Refuse(refusal, Refusal::kNotNitf);

        // FL sits at 342 unless a NITF 2.0 FSDEVT moved it to 382; a file whose
        // FL matches its size at neither place was truncated or is not NITF.
        if (FileLengthMatchesAt(cursor, kFixedLengthOffset, fileSize, lengthText, HL)) {
            fixedLayout = 1;
        } else {
            if (!FileLengthMatchesAt(cursor, kShiftedLengthOffset, fileSize, lengthText, HL))
                return Refuse(refusal, Refusal::kFileLengthMismatch);
            fixedLayout = 0;
        }
        FL = fileSize;

        if (!ReadSegmentGroup(cursor, {6, 10}, NUMI, imageSegments) ||
            !ReadSegmentGroup(cursor, {4, 6}, NUMS, graphicSegments) ||
            !ReadSegmentGroup(cursor, {4, 3}, NUML, labelSegments) ||
            !ReadSegmentGroup(cursor, {4, 5}, NUMT, textSegments) ||
            !ReadSegmentGroup(cursor, {4, 9}, NUMDES, desSegments) ||
            !ReadSegmentGroup(cursor, {4, 7}, NUMRES, resSegments))
            return Refuse(refusal, Refusal::kHeaderFieldInvalid);

        userHeaderOffset = static_cast<uint32_t>(cursor.Position()) + kDataLengthWidth;
        if (!ReadHeaderData(cursor, UDHDL, UDHOFL, UDHD))
            return Refuse(refusal, Refusal::kHeaderFieldInvalid);
        if (UDHDL == 0)
            userHeaderOffset = kNoUserHeader;
        if (!ReadHeaderData(cursor, XHDL, XHDLOFL, XHD))
            return Refuse(refusal, Refusal::kHeaderFieldInvalid);

        // HL is where the first image subheader begins: not inside this header, not past the file.
        return Check(HL >= cursor.Position() && HL <= fileSize, refusal, Refusal::kHeaderFieldInvalid);
    } catch (...) {
        return Refuse(refusal, Refusal::kUnexpected);
    }
}

void CNitfFileHeader::Release()
{
    delete[] XHD;
    XHD = nullptr;
    delete[] UDHD;
    UDHD = nullptr;
    delete[] resSegments;
    resSegments = nullptr;
    delete[] desSegments;
    desSegments = nullptr;
    delete[] textSegments;
    textSegments = nullptr;
    delete[] labelSegments;
    labelSegments = nullptr;
    delete[] graphicSegments;
    graphicSegments = nullptr;
    delete[] imageSegments;
    imageSegments = nullptr;
    path.clear();
}

bool CNitfFileHeader::HasRpfHeader() const
{
    const size_t tagLength = sizeof kRpfHeaderTag - 1;
    return UDHDL == kRpfUserHeaderLength && UDHD != nullptr &&
           strncasecmp(reinterpret_cast<const char*>(UDHD), kRpfHeaderTag, tagLength) == 0;
}
