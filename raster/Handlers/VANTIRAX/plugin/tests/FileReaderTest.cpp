#include "base/FileReader.h"
#include "plugin/Palette.h"

#include <gtest/gtest.h>

#include "tests/fixtures/TempFiles.h"

#include <cstring>
#include <string>

namespace {

TEST(FileReader, ReadWithoutFileLeavesBufferAndFieldsAlone)
{
    CFileReader reader;
    char buffer[4] = {'a', 'b', 'c', 'd'};
    reader.ReadBytes(buffer, 4);
    EXPECT_EQ(std::memcmp(buffer, "abcd", 4), 0);
    EXPECT_EQ(reader.handle, kNoFile);
    EXPECT_EQ(reader.position, 0u);
    EXPECT_EQ(reader.endOfFile, 0);
    EXPECT_TRUE(reader.Failed());
}

TEST(FileReader, ShortReadSetsEndOfFileAndAdvancesByWhatWasRead)
{
    TempFile path("0123456789", ".bin");
    CFileReader reader;
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    ASSERT_TRUE(reader.HoldsFile());
    EXPECT_EQ(reader.FileSize(), 10u);
    char buffer[10] = {};
    reader.SeekTo(6, kSeekSet);
    reader.ReadBytes(buffer, 10);
    EXPECT_EQ(reader.endOfFile, 1);
    EXPECT_EQ(reader.position, 10u);
    EXPECT_EQ(std::memcmp(buffer, "6789", 4), 0);
}

TEST(FileReader, FailedSeekIsStickyUntilReopen)
{
    TempFile path("0123456789", ".bin");
    CFileReader reader;
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    reader.SeekTo(-5, kSeekSet);
    EXPECT_EQ(reader.error, kSeekFailed);
    char buffer[2] = {'x', 'y'};
    reader.SeekTo(0, kSeekSet);
    reader.ReadBytes(buffer, 2);
    EXPECT_EQ(buffer[0], 'x');
    EXPECT_EQ(reader.error, kSeekFailed);

    // Opening again over a held file closes it and clears every field.
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    EXPECT_EQ(reader.error, 0);
    EXPECT_EQ(reader.position, 0u);
    reader.ReadBytes(buffer, 2);
    EXPECT_EQ(std::memcmp(buffer, "01", 2), 0);
    EXPECT_FALSE(reader.Failed());
}

TEST(FileReader, RefusesMissingNullAndOverlongPaths)
{
    CFileReader reader;
    reader.OpenFile("/nonexistent/file.ntf", kShareDenyWrite);
    EXPECT_EQ(reader.handle, kNoFile);
    reader.OpenFile(nullptr, kShareDenyWrite);
    EXPECT_EQ(reader.handle, kNoFile);
    // 259 characters plus the terminator would fit; 260 do not.
    std::string overlong = "/tmp/" + std::string(kReaderPathSize - 5, 'a');
    ASSERT_EQ(overlong.size(), kReaderPathSize);
    reader.OpenFile(overlong.c_str(), kShareDenyWrite);
    EXPECT_EQ(reader.handle, kNoFile);
    EXPECT_EQ(reader.path[0], '\0');
}

TEST(Palette, CreateAndDestroy)
{
    RHPalette* empty = CreatePalette(0);
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty->signature, kPaletteAlive);
    EXPECT_EQ(empty->entryCount, 0);
    EXPECT_EQ(empty->entries, nullptr);
    DestroyPalette(empty);
    DestroyPalette(nullptr);

    RHPalette* palette = CreatePalette(217);
    ASSERT_NE(palette, nullptr);
    ASSERT_NE(palette->entries, nullptr);
    palette->entries[216 * 3 + 2] = 255; // the last byte is writable
    DestroyPalette(palette);
}

} // namespace
