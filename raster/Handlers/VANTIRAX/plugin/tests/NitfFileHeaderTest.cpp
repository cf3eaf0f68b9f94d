#include "base/FieldNumbers.h"
#include "nitf/NitfFileHeader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <string>

namespace {

constexpr uint32_t kRpfHeaderDataLength = 48;

std::string RpfUserHeaderData(const std::string& tag = "RPFHDR")
{
    return Tre(tag, std::string(kRpfHeaderDataLength, '\0'));
}

// Writes a file to a temporary path and parses its header.
class ParsedHeader {
public:
    explicit ParsedHeader(const std::string& bytes) : file_(bytes, ".ntf")
    {
        header.SetPath(file_.c_str());
        parsed = header.Parse();
    }

    CNitfFileHeader header;
    bool parsed = false;

private:
    TempFile file_;
};

NitfFilePlan OneImage(bool version21)
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

TEST(NitfFileHeader, Nitf21WithEverySegmentGroup)
{
    NitfFilePlan plan = OneImage(true);
    plan.images.push_back({"ab", "cdef"});
    plan.graphics.push_back({std::string(258, 'g'), "graphic"});
    plan.texts.push_back({std::string(282, 't'), "hello"});
    plan.dataExtensions.push_back({std::string(200, 'd'), "des"});
    plan.reservedExtensions.push_back({std::string(200, 'r'), "res"});
    plan.extendedHeaderData = Tre("XTRA01", "xyz");
    ParsedHeader file(BuildNitfFile(plan));
    ASSERT_TRUE(file.parsed);
    const CNitfFileHeader& h = file.header;
    EXPECT_EQ(h.version21, 1);
    EXPECT_EQ(h.fixedLayout, 1);
    EXPECT_EQ(h.HL, NitfHeaderLength(plan));
    ASSERT_EQ(h.NUMI, 2);
    EXPECT_EQ(h.imageSegments[0].subheaderLength, 300u);
    EXPECT_EQ(h.imageSegments[0].dataLength, 1000u);
    EXPECT_EQ(h.imageSegments[1].dataLength, 4u);
    ASSERT_EQ(h.NUMS, 1);
    EXPECT_EQ(h.graphicSegments[0].dataLength, 7u);
    EXPECT_EQ(h.NUML, 0);
    EXPECT_EQ(h.labelSegments, nullptr);
    ASSERT_EQ(h.NUMT, 1);
    EXPECT_EQ(h.textSegments[0].subheaderLength, 282u);
    ASSERT_EQ(h.NUMDES, 1);
    ASSERT_EQ(h.NUMRES, 1);
    EXPECT_EQ(h.resSegments[0].dataLength, 3u);
    EXPECT_EQ(h.UDHDL, 0);
    EXPECT_EQ(h.userHeaderOffset, kNoUserHeader);
    EXPECT_EQ(h.XHDL, 3 + 11 + 3);
    ASSERT_NE(h.XHD, nullptr);
    EXPECT_EQ(std::string(reinterpret_cast<char*>(h.XHD), 6), "XTRA01");
}

TEST(NitfFileHeader, Nitf20WithAndWithoutDowngradeEvent)
{
    NitfFilePlan plan = OneImage(false);
    plan.labels.push_back({std::string(320, 'l'), "label"});
    ParsedHeader plain(BuildNitfFile(plan));
    ASSERT_TRUE(plain.parsed);
    EXPECT_EQ(plain.header.version21, 0);
    EXPECT_EQ(plain.header.fixedLayout, 1);
    ASSERT_EQ(plain.header.NUML, 1);
    EXPECT_EQ(plain.header.labelSegments[0].dataLength, 5u);
    EXPECT_EQ(plain.header.graphicSegments, nullptr);

    plan.downgradeEvent = true;
    ParsedHeader downgraded(BuildNitfFile(plan));
    ASSERT_TRUE(downgraded.parsed);
    EXPECT_EQ(downgraded.header.fixedLayout, 0);
    EXPECT_EQ(downgraded.header.HL, NitfHeaderLength(plan));
    EXPECT_EQ(downgraded.header.NUML, 1);
}

TEST(NitfFileHeader, RpfHeaderRecognisedOnlyWithLength62)
{
    NitfFilePlan plan = OneImage(true);
    plan.userHeaderData = RpfUserHeaderData();
    ParsedHeader frame(BuildNitfFile(plan));
    ASSERT_TRUE(frame.parsed);
    EXPECT_EQ(frame.header.UDHDL, 62);
    EXPECT_TRUE(frame.header.HasRpfHeader());
    // userHeaderOffset + 14 is the first byte of the RPF header data.
    std::string bytes = BuildNitfFile(plan);
    EXPECT_EQ(bytes.substr(frame.header.userHeaderOffset, 9), "000RPFHDR");

    plan.userHeaderData = RpfUserHeaderData("rpfhdr");
    ParsedHeader lowerCase(BuildNitfFile(plan));
    EXPECT_TRUE(lowerCase.header.HasRpfHeader());

    plan.userHeaderData = Tre("RPFHDR", std::string(kRpfHeaderDataLength + 1, '\0'));
    ParsedHeader longer(BuildNitfFile(plan));
    ASSERT_TRUE(longer.parsed);
    EXPECT_EQ(longer.header.UDHDL, 63);
    EXPECT_FALSE(longer.header.HasRpfHeader());
}

TEST(NitfFileHeader, RefusesWrongVersionsAndLengths)
{
    std::string good = BuildNitfFile(OneImage(true));
    for (const char* version : {"NITF02.01", "NITF01.10", "NSIF01.00", "NITF03.00"}) {
        std::string bytes = good;
        bytes.replace(0, 9, version);
        EXPECT_FALSE(ParsedHeader(bytes).parsed) << version;
    }
    // A file truncated after writing: FL larger than the file.
    EXPECT_FALSE(ParsedHeader(good.substr(0, good.size() - 1)).parsed);
    // A file with bytes appended: FL smaller than the file.
    EXPECT_FALSE(ParsedHeader(good + "x").parsed);
    EXPECT_FALSE(ParsedHeader("").parsed);
    EXPECT_FALSE(ParsedHeader("NITF02.10").parsed);
}

TEST(NitfFileHeader, RefusesLengthsThatLie)
{
    NitfFilePlan plan = OneImage(true);
    plan.userHeaderData = Tre("ABCDEF", "x");
    // UDHDL of 1 or 2 would give a negative data size.
    for (int64_t lie : {1, 2}) {
        plan.declaredUserHeaderLength = lie;
        EXPECT_FALSE(ParsedHeader(BuildNitfFile(plan)).parsed) << lie;
    }
    // UDHDL running past the end of the file.
    plan.declaredUserHeaderLength = 99999;
    EXPECT_FALSE(ParsedHeader(BuildNitfFile(plan)).parsed);
    plan.declaredUserHeaderLength = -1;
    plan.extendedHeaderData = "x";
    plan.declaredExtendedHeaderLength = 2;
    EXPECT_FALSE(ParsedHeader(BuildNitfFile(plan)).parsed);

    // A segment count running past the end of the file whose FL still matches.
    std::string bytes = BuildNitfFile(OneImage(true));
    bytes.replace(360, 3, "999");
    EXPECT_FALSE(ParsedHeader(bytes).parsed);
    // A non-numeric count.
    bytes = BuildNitfFile(OneImage(true));
    bytes.replace(360, 3, "-1x");
    EXPECT_FALSE(ParsedHeader(bytes).parsed);
}

TEST(NitfFileHeader, NoImageSegmentsStillParses)
{
    NitfFilePlan plan;
    ParsedHeader file(BuildNitfFile(plan));
    ASSERT_TRUE(file.parsed);
    EXPECT_EQ(file.header.NUMI, 0);
    EXPECT_EQ(file.header.imageSegments, nullptr);
}

} // namespace
