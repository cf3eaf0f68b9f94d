// What every open reads first: the file reader, the decimal fields and the NITF file header.
#include "base/FieldNumbers.h"
#include "base/FileReader.h"
#include "nitf/NitfFileHeader.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

namespace {

bool Parses(const std::string& bytes, CNitfFileHeader& header)
{
    const TempFile file(bytes, ".ntf");
    header.SetPath(file.c_str());
    return header.Parse();
}

TEST(FileReader, ReadsSeeksItsTwoStickyFlagsAndRefusedPaths)
{
    CFileReader reader;
    char buffer[10] = {'a', 'b', 'c', 'd'};
    reader.ReadBytes(buffer, 4); // no file: buffer and fields alone
    EXPECT_TRUE(std::memcmp(buffer, "abcd", 4) == 0 && reader.handle == kNoFile && reader.Failed() &&
                reader.position + reader.endOfFile == 0);
    TempFile path("0123456789", ".bin");
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    ASSERT_TRUE(reader.HoldsFile() && reader.FileSize() == 10u);
    reader.SeekTo(6, kSeekSet);
    reader.ReadBytes(buffer, 10); // a short read sets end of file and advances by what was read
    EXPECT_TRUE(reader.endOfFile == 1 && reader.position == 10u && std::memcmp(buffer, "6789", 4) == 0);
    reader.OpenFile(path.c_str(), kShareDenyWrite); // opening again clears every field
    EXPECT_FALSE(reader.Failed());
    reader.SeekTo(-5, kSeekSet); // a failed seek sticks: later seeks and reads do nothing
    reader.SeekTo(0, kSeekSet);
    reader.ReadBytes(buffer, 2);
    EXPECT_TRUE(reader.error == kSeekFailed && buffer[0] == '6');
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    EXPECT_TRUE(reader.error == 0 && reader.position == 0u);
    reader.ReadBytes(buffer, 2);
    EXPECT_TRUE(std::memcmp(buffer, "01", 2) == 0 && !reader.Failed());
    // A path of kReaderPathSize characters leaves no room for the terminator.
    const std::string overlong = "/tmp/" + std::string(kReaderPathSize - 5, 'a');
    for (const char* refused : {overlong.c_str(), "/nonexistent/file.ntf", static_cast<const char*>(nullptr)}) {
        reader.OpenFile(refused, kShareDenyWrite); // and the file open before is closed
        EXPECT_TRUE(reader.handle == kNoFile && reader.path[0] == '\0');
    }
}

TEST(FieldNumbers, ConvertLikeAtolWithinWidth)
{
    // The last two are 16 characters wide and out of 32-bit range.
    for (const auto& [text, width, value] : {std::tuple{"00123", 5u, 123}, {"  -42xyz", 8u, -42}, {"12345", 3u, 123},
                                             {"abc", 3u, 0}, {"1234567890123456", 16u, 0}, {"99999999999", 11u, 0}})
        EXPECT_EQ(FieldToLong(text, width), value) << text;
    for (const auto& [text, width, value] : {std::tuple{"+12.5000", 8u, 12.5}, {"-0.25E", 5u, -0.25},
                                             {"11111111111111111111111111111111", 32u, 0.0}})
        EXPECT_DOUBLE_EQ(FieldToDouble(text, width), value) << text;
}

// Both versions with and without a downgrade event, every segment group and extended header
// data: the image segments are where the header says. An RPF header is user-defined header data
// of exactly 62 bytes (RPFHDR data of 48), tag in either case; userHeaderOffset + 14 is its first byte.
TEST(NitfFileHeader, SegmentGroupsOfBothVersionsAndTheRpfHeader)
{
    struct Case { bool version21, event; const char* tag; int dataLength; bool rpf; };
    for (const Case& c : {Case{true, false, "RPFHDR", 48, true}, {true, true, "rpfhdr", 48, true},
                          {false, false, "RPFHDR", 49, false}, {false, true, "RPFHDR", 47, false}}) {
        const NitfFilePlan plan{c.version21, c.event, {{std::string(300, 'S'), std::string(1000, 'D')}, {"ab", "cdef"}},
                                {{std::string(258, 'g'), "graphic"}}, {{std::string(320, 'l'), "label"}},
                                {{std::string(282, 't'), "hello"}}, {{std::string(200, 'd'), "des"}},
                                {{std::string(200, 'r'), "res"}}, Tre(c.tag, std::string(size_t(c.dataLength), '\0')),
                                Tre("XTRA01", "xyz"), -1, -1};
        const std::string bytes = BuildNitfFile(plan);
        CNitfFileHeader h;
        ASSERT_TRUE(Parses(bytes, h)) << c.version21 << c.event;
        EXPECT_EQ(std::vector<int64_t>({h.version21, h.fixedLayout, h.HL, h.NUMI, h.NUMS, h.NUML, h.NUMT, h.NUMDES,
                                        h.NUMRES, h.UDHDL, h.XHDL, h.HasRpfHeader()}),
                  std::vector<int64_t>({c.version21, c.event && !c.version21 ? 0 : 1, NitfHeaderLength(plan), 2, 1, 1,
                                        1, 1, 1, 14 + c.dataLength, 3 + 11 + 3, c.rpf}));
        ASSERT_TRUE(h.imageSegments != nullptr && h.XHD != nullptr);
        EXPECT_EQ(h.imageSegments[0].subheaderLength * 10000 + h.imageSegments[0].dataLength, 300u * 10000 + 1000);
        EXPECT_EQ(h.imageSegments[1].subheaderLength + h.imageSegments[1].dataLength, 6u);
        EXPECT_EQ(bytes.substr(h.userHeaderOffset, 9), "000" + std::string(c.tag));
        EXPECT_EQ(std::string(reinterpret_cast<char*>(h.XHD), 6), "XTRA01");
    }
    CNitfFileHeader none; // no segments at all still parses
    ASSERT_TRUE(Parses(BuildNitfFile(NitfFilePlan{}), none));
    EXPECT_TRUE(none.NUMI == 0 && none.imageSegments == nullptr && none.userHeaderOffset == kNoUserHeader);
}

TEST(NitfFileHeader, RefusesWrongVersionsAndLengthsThatLie)
{
    const auto declaring = [](int64_t udhdl, int64_t xhdl) { // -1: the true length
        return BuildNitfFile({true, false, {{std::string(300, 'S'), std::string(1000, 'D')}}, {}, {}, {}, {}, {},
                              Tre("ABCDEF", "x"), xhdl < 0 ? "" : "x", udhdl, xhdl});
    };
    const std::string good = declaring(-1, -1), rest = good.substr(9);
    const Refusal kVersion = Refusal::kNotNitf, kLength = Refusal::kFileLengthMismatch,
                  kField = Refusal::kHeaderFieldInvalid;
    // Other versions; FL larger or smaller than the file; a segment count running past the end of the file whose FL
    // still matches, or not a number; UDHDL of 1 or 2 (a negative data size) or past the end of the file; XHDL 2.
    for (const auto& [bad, why] : std::initializer_list<std::pair<std::string, Refusal>>{
             {"NITF02.01" + rest, kVersion}, {"NITF01.10" + rest, kVersion}, {"NSIF01.01" + rest, kVersion},
             {"NITF03.00" + rest, kVersion}, {good.substr(0, good.size() - 1), kLength}, {good + "x", kLength},
             {"", kVersion}, {"NITF02.10", kVersion}, {good.substr(0, 360) + "999" + good.substr(363), kField},
             {good.substr(0, 360) + "-1x" + good.substr(363), kField}, {declaring(1, -1), kField},
             {declaring(2, -1), kField}, {declaring(99999, -1), kField}, {declaring(-1, 2), kField}}) {
        CNitfFileHeader header;
        EXPECT_FALSE(Parses(bad, header)) << bad.substr(0, 9) << " " << bad.size();
        EXPECT_EQ(header.refusal, why) << bad.substr(0, 9) << " " << bad.size();
    }
}

} // namespace
