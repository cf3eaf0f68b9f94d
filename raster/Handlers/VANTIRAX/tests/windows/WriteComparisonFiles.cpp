// vx_write_comparison_files DIRECTORY: the sample files of every kind, NAME.ntf
// each, so that two builds of the handler can be run on the same files and
// their answers compared (scripts/test-windows).
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <cstdio>

int main(int argc, char** argv)
{
    if (argc != 2)
        return std::fprintf(stderr, "usage: vx_write_comparison_files DIRECTORY\n"), 2;
    for (const SampleFile& file : FilesOfEveryKind())
        WriteFile(std::string(argv[1]) + "/" + file.name + ".ntf", file.bytes);
    return 0;
}
