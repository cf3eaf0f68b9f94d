// Writes the sample files of every kind into a directory, NAME.ntf each, so
// that two builds of the handler can be run on the same files and their
// answers compared (scripts/test-windows).
//
//   vx_write_comparison_files DIRECTORY
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <cstdio>
#include <exception>

int main(int argc, char** argv)
{
    if (argc != 2) {
        std::fprintf(stderr, "usage: vx_write_comparison_files DIRECTORY\n");
        return 2;
    }
    try {
        for (const SampleFile& file : FilesOfEveryKind())
            WriteFile(std::string(argv[1]) + "/" + file.name + ".ntf", file.bytes);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "vx_write_comparison_files: %s\n", failure.what());
        return 1;
    }
    return 0;
}
