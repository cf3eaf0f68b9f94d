// nitfinfo run as a user runs it: the fields it prints of fixture and real files against what GDAL reads of them, and
// its exit codes and messages.
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <regex>
#include <sys/wait.h>

namespace {

struct Outcome { int exitCode; std::string out, err; };

Outcome RunInfo(const std::string& arguments)
{
    TempFile err(".err");
    int status = -1;
    const std::string out = RunCommand("(" VX_NITFINFO_PATH " " + arguments + " 2>" + err.path() + ")", &status);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, out, ReadWholeFile(err.path())};
}

// Every match of the pattern: its first group mapped to its second (if any), the last match winning.
std::map<std::string, std::string> Matches(const std::string& text, const std::string& pattern)
{
    const std::regex expression(pattern);
    std::map<std::string, std::string> found;
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it)
        found[(*it)[1]] = (*it)[2];
    return found;
}

// What gdalinfo -mdd TRE says: every "  KEY=value" line (NITF_ fields, subdatasets), the size, the band count and the
// TRE section.
std::map<std::string, std::string> GdalFields(const std::string& path)
{
    const std::string text = RunCommand("gdalinfo -mdd TRE '" + path + "'");
    std::map<std::string, std::string> fields = Matches(text, "\n  (\\w+)=([^\n]*)");
    fields["bands"] = std::to_string(NumbersIn(text, "\nBand \\d").size());
    fields["TREs"] = Matches(text, "Metadata \\(TRE\\):()([^]*?)\n[A-Z]")[""];
    for (const auto& [width, height] : Matches(text, "Size is (\\d+), (\\d+)"))
        fields["size"] = width + "x" + height;
    return fields;
}

// The first value nitfinfo's JSON gives a name (the first image's for image fields), "-" for none.
std::string Ours(const std::string& json, const std::string& name)
{
    std::smatch match;
    if (!std::regex_search(json, match, std::regex("\"" + name + "\": (\"((\\\\.|[^\"])*)\"|\\w+|\\[[^\\]]*\\])")))
        return "-";
    return match[2].matched ? match[2].str() : match[1].str();
}

// A sample written as a fixture file named `location`, or none and `location` is a real file's corpus path.
struct InfoCase { const char *sample, *location; bool served; };
const InfoCase kCases[] = {
    {"mono_geographic", "mono.ntf", true},         {"rgb_band_sequential_mgrs_20", "rgb20.ntf", true}, // TRE in UDID
    {"compressed_jpeg_grey", "jpeg.ntf", true},    {"cadrg_big_endian", "00001011.ON1", true},
    {"cib", "0000201A.I12", true},                 {nullptr, "rpf/cadrg/001zc013.on1", true},
    {nullptr, "jitc-nitf20/U_1001A.NTF", true},    {nullptr, "rpf/cib-ftdrum/rpf/n44w076/004b1r16.i12", true},
    {nullptr, "jitc-nitf21/ns3301j.nsf", true},    {nullptr, "jitc-nitf21/i_3113g.ntf", true}, // two images
    {nullptr, "jitc-nitf21/i_3450c.ntf", false},   {nullptr, "other/valid_udid.ntf", true},    // two TREs
};

TEST(NitfInfo, FieldsAgreeWithGdal)
{
    VX_SKIP_WITHOUT_GDAL();
    const bool haveCorpus = std::filesystem::is_directory(CorpusPath()); // else only the fixture files compare
    TempDirectory folder;
    for (const InfoCase& row : kCases) {
        if (!row.sample && !haveCorpus)
            continue;
        const std::string path = row.sample ? folder / row.location : CorpusPath(row.location);
        if (row.sample)
            WriteFile(path, SampleBytes(row.sample));
        SCOPED_TRACE(path);
        const Outcome run = RunInfo("--json '" + path + "'");
        ASSERT_EQ(run.exitCode, 0) << run.err;
        std::map<std::string, std::string> gdal = GdalFields(path);
        for (const std::string name : {"FHDR", "FTITLE", "FSCLAS", "IID1", "IDATIM", "ICAT", "ISORCE", "IC", "IREP",
                                       "IMODE", "PVTYPE", "ICORDS", "IGEOLO"})
            EXPECT_EQ(Ours(run.out, name), gdal.count("NITF_" + name) ? gdal["NITF_" + name] : "-") << name;
        EXPECT_EQ(std::stoi(Ours(run.out, "ABPP")), std::stoi(gdal["NITF_ABPP"]));
        EXPECT_EQ(Ours(run.out, "NCOLS") + "x" + Ours(run.out, "NROWS") + ", " + Ours(run.out, "NBANDS") + " bands",
                  gdal["size"] + ", " + gdal["bands"] + " bands");
        EXPECT_EQ(std::stoi(Ours(run.out, "NUMI")), gdal.count("SUBDATASET_2_NAME") ? 2 : 1);
        EXPECT_EQ(Ours(run.out, "served"), row.served ? "true" : "false");
        // GDAL's TREs include those of the file header and DES.
        EXPECT_EQ(Matches(Ours(run.out, "TREs"), "\"(\\w+)\""), Matches(gdal["TREs"], "\n  (?!RPFHDR|RPFDES)(\\w+)="));
        // GDAL names an RPF frame's series from its file name too: "ONC", or CIB's "10 meter".
        const std::string series = Ours(run.out, "series");
        const std::string gdalSeries = gdal["NITF_SERIES_ABBREVIATION"] + "|" + gdal["NITF_SERIES_NAME"];
        std::smatch term;
        const bool known = std::regex_search(series, term, std::regex("^CIB ([0-9.]+) m$|^(\\w+) 1:"));
        const std::string expected = !known ? "|" : term[1].matched ? term[1].str() + " meter" : term[2].str() + "|";
        EXPECT_TRUE(known ? gdalSeries.find(expected) != std::string::npos : gdalSeries == expected) << series;
    }
}

TEST(NitfInfo, ExitCodesMessagesAndUntrustedText)
{
    TempDirectory folder;
    const std::string good = folder / "good.ntf", text = folder / "text.ntf", odd = folder / "odd.ntf";
    std::string bytes = SampleBytes("mono_geographic");
    WriteFile(good, bytes), WriteFile(text, std::string(400, 'x'));
    WriteFile(odd, bytes.replace(39, 6, "\x01\"\\\t\x7f\xff")); // FTITLE "fixture" begins with these
    const std::string aridpcm = folder / "c2.ntf", real = folder / "real.ntf"; // described, not served
    NitfImagePlan c2, real32;
    c2.IC = "C2", c2.COMRAT = "00.0", real32.PVTYPE = "R", real32.NBPP = 32;
    WriteFile(aridpcm, BuildImageFile(c2, "x")), WriteFile(real, BuildImageFile(real32, "1234"));
    // errLines: one per refused file; -1 for the usage.
    const struct { std::string arguments; int exitCode; long errLines; std::string inOut, inErr; } cases[] = {
        {"--help", 0, 0, "usage: nitfinfo", ""},
        {"", 2, -1, "", "usage: nitfinfo"},
        {"--bogus " + good, 2, -1, "", "unknown option --bogus"},
        {folder / "missing.ntf " + good, 1, 1, "FTITLE      fixture", "missing.ntf: no such file\n"},
        {folder.path() + " " + text, 1, 2, "", "not a regular file\nnitfinfo: " + text + ": not a NITF"},
        {odd, 0, 0, "FTITLE      ?\"\\???e\n", ""},
        {real, 0, 0, "served      no\n  reason      pixel type PVTYPE R is not served\n", ""},
        {"--json " + aridpcm, 0, 0, R"("served": false, "reason": "compression IC C2 (ARIDPCM) is not served")", ""},
        {"--json " + odd + " " + text + " " + good, 1, 1, R"("FTITLE": "?\"\\???e", "FSCLAS": "U")", "text.ntf: not"},
    };
    for (const auto& row : cases) {
        SCOPED_TRACE(row.arguments);
        const Outcome run = RunInfo(row.arguments);
        EXPECT_EQ(run.exitCode, row.exitCode);
        EXPECT_NE(run.out.find(row.inOut), std::string::npos) << run.out;
        EXPECT_NE(run.err.find(row.inErr), std::string::npos) << run.err;
        EXPECT_TRUE(row.errLines < 0 || std::count(run.err.begin(), run.err.end(), '\n') == row.errLines) << run.err;
        WriteFile(folder / "out.json", run.out);
        const bool json = row.arguments.rfind("--json", 0) == 0;
        EXPECT_TRUE(!json || CommandSucceeds("python3 -m json.tool '" + folder / "out.json" + "'")) << run.out;
    }
}

} // namespace
