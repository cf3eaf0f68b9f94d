#include "base/FileReader.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

namespace {

TEST(FileReader, ReadsSeeksAndItsTwoStickyFlags)
{
    CFileReader reader;
    char buffer[10] = {'a', 'b', 'c', 'd'};
    reader.ReadBytes(buffer, 4); // no file: buffer and fields alone
    EXPECT_EQ(std::memcmp(buffer, "abcd", 4), 0);
    EXPECT_EQ(reader.handle, kNoFile);
    EXPECT_EQ(reader.position + reader.endOfFile, 0u);
    EXPECT_TRUE(reader.Failed());

    TempFile path("0123456789", ".bin");
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    ASSERT_TRUE(reader.HoldsFile());
    EXPECT_EQ(reader.FileSize(), 10u);
    reader.SeekTo(6, kSeekSet);
    reader.ReadBytes(buffer, 10); // a short read sets end of file and advances by what was read
    EXPECT_EQ(reader.endOfFile, 1);
    EXPECT_EQ(reader.position, 10u);
    EXPECT_EQ(std::memcmp(buffer, "6789", 4), 0);

    reader.OpenFile(path.c_str(), kShareDenyWrite); // opening again clears every field
    EXPECT_FALSE(reader.Failed());
    reader.SeekTo(-5, kSeekSet); // a failed seek sticks: later seeks and reads do nothing
    EXPECT_EQ(reader.error, kSeekFailed);
    reader.SeekTo(0, kSeekSet);
    reader.ReadBytes(buffer, 2);
    EXPECT_EQ(buffer[0], '6');
    EXPECT_EQ(reader.error, kSeekFailed);
    reader.OpenFile(path.c_str(), kShareDenyWrite);
    EXPECT_EQ(reader.error, 0);
    EXPECT_EQ(reader.position, 0u);
    reader.ReadBytes(buffer, 2);
    EXPECT_EQ(std::memcmp(buffer, "01", 2), 0);
    EXPECT_FALSE(reader.Failed());
}

TEST(FileReader, RefusesMissingNullAndOverlongPaths)
{
    // 259 characters and the terminator fit; 260 do not.
    const std::string overlong = "/tmp/" + std::string(kReaderPathSize - 5, 'a');
    for (const char* path : {"/nonexistent/file.ntf", static_cast<const char*>(nullptr), overlong.c_str()}) {
        CFileReader reader;
        reader.OpenFile(path, kShareDenyWrite);
        EXPECT_EQ(reader.handle, kNoFile);
        EXPECT_EQ(reader.path[0], '\0');
    }
}

} // namespace
