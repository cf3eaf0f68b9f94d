// nitfinfo FILE...: what a NITF or NSIF file, or an RPF frame, is, read with
// the library's own parsers.
#include "FileInfo.h"

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

namespace {

constexpr int kExitFileRefused = 1;
constexpr int kExitBadArguments = 2;

constexpr char kUsage[] =
    "usage: nitfinfo [--json] FILE...\n"
    "  Prints each file's NITF version, FTITLE, FSCLAS and image segment count, whether the handler\n"
    "  serves it and why not, the series, zone and producer of an RPF frame's name, and for every\n"
    "  image segment IID1, IDATIM, ICAT, ISORCE, IC, COMRAT, IREP, IMODE, NBPP, ABPP, PVTYPE, NROWS,\n"
    "  NCOLS, NPPBH, NPPBV, NBPR, NBPC, NBANDS, ICORDS, IGEOLO and the tags of its extensions.\n"
    "  --json   one JSON array with an object per file, for scripts\n"
    "  Exit codes: 0 every file reported; 1 a file missing, not a regular file or not NITF (why, on stderr);\n"
    "  2 bad arguments.\n";

} // namespace

int main(int argc, char** argv)
{
    bool json = false;
    std::vector<std::string> paths;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--help") == 0 || std::strcmp(argv[i], "-h") == 0) {
            std::fputs(kUsage, stdout);
            return 0;
        }
        if (std::strcmp(argv[i], "--json") == 0)
            json = true;
        else if (argv[i][0] == '-' && argv[i][1] != '\0') {
            const std::string option = PrintableText(argv[i], std::strlen(argv[i]));
            std::fprintf(stderr, "nitfinfo: unknown option %s\n%s", option.c_str(), kUsage);
            return kExitBadArguments;
        } else
            paths.push_back(argv[i]);
    }
    if (paths.empty()) {
        std::fputs(kUsage, stderr);
        return kExitBadArguments;
    }
    int exitCode = 0;
    bool first = true;
    std::fputs(json ? "[" : "", stdout);
    for (const std::string& path : paths) {
        FileInfo info;
        std::string reason;
        if (!DescribeFile(path, info, reason)) {
            std::fflush(stdout);
            std::fprintf(stderr, "nitfinfo: %s: %s\n", PrintableText(path.data(), path.size()).c_str(), reason.c_str());
            exitCode = kExitFileRefused;
            continue;
        }
        std::string out = first ? "" : (json ? ",\n" : "\n");
        first = false;
        json ? PrintJson(info, out) : PrintText(info, out);
        std::fwrite(out.data(), 1, out.size(), stdout);
    }
    std::fputs(json ? "]\n" : "", stdout);
    return exitCode;
}
