#include "base/FieldNumbers.h"
#include "nitf/NitfFileHeader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <string>

namespace {

// A file written to a temporary path with its header parsed.
struct ParsedHeader {
    explicit ParsedHeader(const std::string& bytes) : file(bytes, ".ntf")
    {
        header.SetPath(file.c_str());
        parsed = header.Parse();
    }
    TempFile file;
    CNitfFileHeader header;
    bool parsed = false;
};

NitfFilePlan OneImage(bool version21 = true)
{
    NitfFilePlan plan;
    plan.version21 = version21;
    plan.images.push_back({std::string(300, 'S'), std::string(1000, 'D')});
    return plan;
}

TEST(FieldNumbers, ConvertLikeAtolWithinWidth)
{
    EXPECT_EQ(FieldToLong("00123", 5), 123);
    EXPECT_EQ(FieldToLong("  -42xyz", 8), -42);
    EXPECT_EQ(FieldToLong("12345", 3), 123);
    EXPECT_EQ(FieldToLong("abc", 3), 0);
    EXPECT_EQ(FieldToLong("1234567890123456", 16), 0);
    EXPECT_EQ(FieldToLong("99999999999", 11), 0); // out of 32-bit range
    EXPECT_DOUBLE_EQ(FieldToDouble("+12.5000", 8), 12.5);
    EXPECT_DOUBLE_EQ(FieldToDouble("-0.25E", 5), -0.25);
    EXPECT_DOUBLE_EQ(FieldToDouble(std::string(32, '1').c_str(), 32), 0.0);
}

// Both versions with and without a downgrade event, every segment group,
// extended header data: the image segments are where the header says.
TEST(NitfFileHeader, SegmentGroupsOfBothVersions)
{
    for (bool version21 : {true, false})
        for (bool event : {false, true}) {
            NitfFilePlan plan = OneImage(version21);
            plan.downgradeEvent = event;
            plan.images.push_back({"ab", "cdef"});
            plan.graphics.push_back({std::string(258, 'g'), "graphic"});
            plan.labels.push_back({std::string(320, 'l'), "label"});
            plan.texts.push_back({std::string(282, 't'), "hello"});
            plan.dataExtensions.push_back({std::string(200, 'd'), "des"});
            plan.reservedExtensions.push_back({std::string(200, 'r'), "res"});
            plan.extendedHeaderData = Tre("XTRA01", "xyz");
            ParsedHeader file(BuildNitfFile(plan));
            ASSERT_TRUE(file.parsed) << version21 << event;
            const CNitfFileHeader& h = file.header;
            EXPECT_EQ(h.version21, version21 ? 1 : 0);
            EXPECT_EQ(h.fixedLayout, event && !version21 ? 0 : 1);
            EXPECT_EQ(h.HL, NitfHeaderLength(plan));
            ASSERT_EQ(h.NUMI, 2);
            EXPECT_EQ(h.imageSegments[0].subheaderLength, 300u);
            EXPECT_EQ(h.imageSegments[0].dataLength, 1000u);
            EXPECT_EQ(h.imageSegments[1].subheaderLength + h.imageSegments[1].dataLength, 6u);
            EXPECT_EQ(std::vector<int>({h.NUMS, h.NUML, h.NUMT, h.NUMDES, h.NUMRES}), std::vector<int>(5, 1));
            EXPECT_EQ(h.UDHDL, 0);
            EXPECT_EQ(h.userHeaderOffset, kNoUserHeader);
            EXPECT_EQ(h.XHDL, 3 + 11 + 3);
            ASSERT_NE(h.XHD, nullptr);
            EXPECT_EQ(std::string(reinterpret_cast<char*>(h.XHD), 6), "XTRA01");
        }
    ParsedHeader none(BuildNitfFile(NitfFilePlan{})); // no segments at all still parses
    ASSERT_TRUE(none.parsed);
    EXPECT_EQ(none.header.NUMI, 0);
    EXPECT_EQ(none.header.imageSegments, nullptr);
}

// An RPF header is user-defined header data of exactly 62 bytes (an RPFHDR
// extension of 48), tag in either case; userHeaderOffset + 14 is its first byte.
TEST(NitfFileHeader, RpfHeaderRecognisedOnlyWithLength62)
{
    NitfFilePlan plan = OneImage();
    for (const auto& [tag, dataLength, rpf] : {std::tuple{"RPFHDR", 48, true}, {"rpfhdr", 48, true},
                                               {"RPFHDR", 49, false}, {"RPFHDR", 47, false}}) {
        plan.userHeaderData = Tre(tag, std::string(size_t(dataLength), '\0'));
        const std::string bytes = BuildNitfFile(plan);
        ParsedHeader file(bytes);
        ASSERT_TRUE(file.parsed);
        EXPECT_EQ(file.header.UDHDL, 14 + dataLength);
        EXPECT_EQ(file.header.HasRpfHeader(), rpf) << tag << dataLength;
        EXPECT_EQ(bytes.substr(file.header.userHeaderOffset, 9), "000" + std::string(tag));
    }
}

TEST(NitfFileHeader, RefusesWrongVersionsAndLengthsThatLie)
{
    const std::string good = BuildNitfFile(OneImage());
    for (const char* version : {"NITF02.01", "NITF01.10", "NSIF01.01", "NITF03.00"})
        EXPECT_FALSE(ParsedHeader(std::string(version) + good.substr(9)).parsed) << version;
    EXPECT_FALSE(ParsedHeader(good.substr(0, good.size() - 1)).parsed); // FL larger than the file
    EXPECT_FALSE(ParsedHeader(good + "x").parsed);                       // FL smaller than the file
    EXPECT_FALSE(ParsedHeader("").parsed);
    EXPECT_FALSE(ParsedHeader("NITF02.10").parsed);
    // A segment count running past the end of the file whose FL still matches, or not a number.
    for (const char* count : {"999", "-1x"})
        EXPECT_FALSE(ParsedHeader(good.substr(0, 360) + count + good.substr(363)).parsed) << count;
    // UDHDL of 1 or 2 (a negative data size) or past the end of the file; XHDL 2.
    struct Lie {
        int64_t userHeader, extendedHeader;
    };
    for (const Lie& lie : {Lie{1, -1}, {2, -1}, {99999, -1}, {-1, 2}}) {
        NitfFilePlan plan = OneImage();
        plan.userHeaderData = Tre("ABCDEF", "x");
        plan.extendedHeaderData = lie.extendedHeader < 0 ? "" : "x";
        plan.declaredUserHeaderLength = lie.userHeader;
        plan.declaredExtendedHeaderLength = lie.extendedHeader;
        EXPECT_FALSE(ParsedHeader(BuildNitfFile(plan)).parsed) << lie.userHeader << " " << lie.extendedHeader;
    }
}

} // namespace
