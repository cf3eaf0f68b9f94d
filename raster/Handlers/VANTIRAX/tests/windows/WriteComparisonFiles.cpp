// vx_write_comparison_files DIRECTORY: the sample files of every kind, NAME.ntf
// each, and a sparse file past 4 GiB as large/over_4_gib.ntf, so that two
// builds of the handler can be run on the same files and their answers
// compared (scripts/test-windows).
#include "tests/SampleFiles.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <cstdio>
#include <sys/stat.h>

int main(int argc, char** argv)
{
    if (argc != 2)
        return std::fprintf(stderr, "usage: vx_write_comparison_files DIRECTORY\n"), 2;
    for (const SampleFile& file : FilesOfEveryKind())
        WriteFile(std::string(argv[1]) + "/" + file.name + ".ntf", file.bytes);
    const std::string large = std::string(argv[1]) + "/large";
    return ::mkdir(large.c_str(), 0700) == 0 && WriteSparseLargeImage(large + "/over_4_gib.ntf") ? 0 : 1;
}
