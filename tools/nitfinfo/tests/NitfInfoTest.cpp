// nitfinfo run as a user runs it: the fields it prints of fixture and real
// files against what GDAL reads of them, and its exit codes and messages.
#include "tests/GdalPeer.h"
#include "tests/SampleFiles.h"
#include "tests/fixtures/Command.h"
#include "tests/fixtures/Corpus.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <regex>
#include <sys/wait.h>

namespace {

struct Outcome {
    int exitCode = -1;
    std::string out, err;
};

Outcome RunInfo(const std::string& arguments)
{
    TempFile err(".err");
    int status = -1;
    Outcome run;
    run.out = RunCommand("(" VX_NITFINFO_PATH " " + arguments + " 2>" + err.path() + ")", &status);
    run.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    run.err = ReadWholeFile(err.path());
    return run;
}

// Tags of the words "tag" (a JSON list) or "  tag=" lines (a gdalinfo section), sorted, joined by blanks.
std::string Tags(const std::string& text, const std::string& pattern)
{
    std::set<std::string> tags;
    const std::regex expression(pattern);
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it)
        tags.insert((*it)[1]);
    std::string joined;
    for (const std::string& tag : tags)
        joined += (joined.empty() ? "" : " ") + tag;
    return joined;
}

// Every "  KEY=value" line of gdalinfo -mdd TRE (NITF_ fields, subdatasets), the size, the band count and
// the TRE tags but those of the file header and DES (RPFHDR, RPFDES).
std::map<std::string, std::string> GdalFields(const std::string& path)
{
    const std::string text = RunCommand("gdalinfo -mdd TRE '" + path + "'");
    std::map<std::string, std::string> fields{{"bands", std::to_string(NumbersIn(text, "\nBand \\d").size())}};
    const std::regex line("\n  (\\w+)=([^\n]*)");
    for (std::sregex_iterator it(text.begin(), text.end(), line), end; it != end; ++it)
        fields[(*it)[1]] = (*it)[2];
    std::smatch section;
    if (std::regex_search(text, section, std::regex("Metadata \\(TRE\\):([^]*?)\n[A-Z]")))
        fields["TREs"] = Tags(section[1], "\n  (?!RPFHDR|RPFDES)(\\w+)=");
    std::smatch size;
    if (std::regex_search(text, size, std::regex("Size is (\\d+), (\\d+)")))
        fields["size"] = size[1].str() + "x" + size[2].str();
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

struct InfoCase {
    const char* sample;   // fixture file written under diskName, or null
    const char* location; // the disk name of a fixture, the corpus path of a real file
    bool served;
};
const InfoCase kCases[] = {
    {"mono_geographic", "mono.ntf", true},
    {"rgb_band_sequential_mgrs_20", "rgb20.ntf", true}, // NITF 2.0, a TRE in UDID
    {"compressed_jpeg_grey", "jpeg.ntf", true},
    {"cadrg_big_endian", "00001011.ON1", true},
    {"cib", "0000201A.I12", true},
    {nullptr, "rpf/cadrg/001zc013.on1", true},
    {nullptr, "rpf/cib-ftdrum/rpf/n44w076/004b1r16.i12", true},
    {nullptr, "jitc-nitf20/U_1034A.NTF", true},
    {nullptr, "jitc-nitf21/i_3113g.ntf", true}, // two images
    {nullptr, "jitc-nitf21/ns3301j.nsf", true},
    {nullptr, "jitc-nitf21/i_3450c.ntf", false}, // floating point
    {nullptr, "other/valid_udid.ntf", true},     // two TREs in UDID
};

TEST(NitfInfo, FieldsAgreeWithGdal)
{
    VX_SKIP_WITHOUT_GDAL();
    const bool haveCorpus = std::filesystem::is_directory(CorpusPath());
    if (!haveCorpus)
        std::cout << "no corpus at " << CorpusPath() << ": only the fixture files are compared\n";
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
                                       "IMODE", "PVTYPE", "IGEOLO"})
            EXPECT_EQ(Ours(run.out, name), gdal.count("NITF_" + name) ? gdal["NITF_" + name] : "-") << name;
        // A NITF 2.0 ICORDS "N" (no corners) is kept as a blank.
        const bool noCorners20 = gdal["NITF_ICORDS"] == "N" && Ours(run.out, "FHDR") == "NITF02.00";
        EXPECT_EQ(Ours(run.out, "ICORDS"), noCorners20 ? "" : gdal["NITF_ICORDS"]);
        EXPECT_EQ(std::stoi(Ours(run.out, "ABPP")), std::stoi(gdal["NITF_ABPP"]));
        EXPECT_EQ(Ours(run.out, "NCOLS") + "x" + Ours(run.out, "NROWS"), gdal["size"]);
        EXPECT_EQ(Ours(run.out, "NBANDS"), gdal["bands"]);
        EXPECT_EQ(std::stoi(Ours(run.out, "NUMI")), gdal.count("SUBDATASET_2_NAME") ? 2 : 1);
        EXPECT_EQ(Ours(run.out, "served"), row.served ? "true" : "false");
        EXPECT_EQ(Tags(Ours(run.out, "TREs"), "\"(\\w+)\""), gdal["TREs"]);
        // GDAL names the series of an RPF frame from its file name too: by abbreviation, or CIB by resolution.
        const std::string series = Ours(run.out, "series"), abbreviation = gdal["NITF_SERIES_ABBREVIATION"];
        std::smatch metres;
        if (gdal.count("NITF_SERIES_NAME"))
            EXPECT_TRUE(abbreviation.empty()
                            ? std::regex_match(series, metres, std::regex("CIB ([0-9.]+) m")) &&
                                  gdal["NITF_SERIES_NAME"].find(metres[1].str() + " meter") != std::string::npos
                            : series.rfind(abbreviation + " ", 0) == 0)
                << series << " / " << gdal["NITF_SERIES_NAME"];
        else
            EXPECT_EQ(series, "-");
    }
}

TEST(NitfInfo, ExitCodesMessagesAndUntrustedText)
{
    TempDirectory folder;
    const std::string good = folder / "good.ntf", text = folder / "text.ntf", odd = folder / "odd.ntf";
    WriteFile(good, SampleBytes("mono_geographic"));
    WriteFile(text, std::string(400, 'x'));
    std::string bytes = SampleBytes("mono_geographic");
    WriteFile(odd, bytes.replace(39, 6, "\x01\"\\\t\x7f\xff")); // FTITLE "fixture" begins with these
    const struct {
        std::string arguments;
        int exitCode;
        long errLines; // one per refused file; -1 for the usage
        std::string inOut, inErr;
    } cases[] = {
        {"--help", 0, 0, "usage: nitfinfo", ""},
        {"", 2, -1, "", "usage: nitfinfo"},
        {"--bogus " + good, 2, -1, "", "unknown option --bogus"},
        {folder / "missing.ntf " + good, 1, 1, "FTITLE      fixture", "missing.ntf: no such file\n"},
        {folder.path() + " " + text, 1, 2, "", "a directory, not a file\nnitfinfo: " + text + ": not a NITF"},
        {odd, 0, 0, "FTITLE      ?\"\\???e\n", ""},
        {"--json " + odd + " " + text + " " + good, 1, 1, R"("FTITLE": "?\"\\???e", "FSCLAS": "U")",
         "text.ntf: not a NITF"},
    };
    for (const auto& row : cases) {
        SCOPED_TRACE(row.arguments);
        const Outcome run = RunInfo(row.arguments);
        EXPECT_EQ(run.exitCode, row.exitCode);
        EXPECT_NE(run.out.find(row.inOut), std::string::npos) << run.out;
        EXPECT_NE(run.err.find(row.inErr), std::string::npos) << run.err;
        EXPECT_TRUE(row.errLines < 0 || std::count(run.err.begin(), run.err.end(), '\n') == row.errLines) << run.err;
        if (row.arguments.rfind("--json", 0) == 0) {
            WriteFile(folder / "out.json", run.out);
            EXPECT_TRUE(CommandSucceeds("python3 -m json.tool '" + folder / "out.json" + "'")) << run.out;
        }
    }
}

} // namespace
