#include "GdalReport.h"

#include "HostProcess.h"
#include "tests/fixtures/NitfFileWriter.h"

#include <regex>

namespace {

const char* const kNumber = "([-+0-9.eE]+)";

std::vector<std::smatch> AllMatches(const std::string& text, const std::regex& pattern)
{
    std::vector<std::smatch> matches;
    for (std::sregex_iterator it(text.begin(), text.end(), pattern), end; it != end; ++it)
        matches.push_back(*it);
    return matches;
}

std::vector<std::array<int, 3>> Triples(const std::string& text, const std::string& pattern)
{
    std::vector<std::array<int, 3>> triples;
    for (const std::smatch& m : AllMatches(text, std::regex(pattern)))
        triples.push_back({std::stoi(m[1]), std::stoi(m[2]), std::stoi(m[3])});
    return triples;
}

// The text between the first `from` and the next `to` after it.
std::string Between(const std::string& text, const std::string& from, const std::string& to)
{
    size_t start = text.find(from);
    if (start == std::string::npos)
        return "";
    size_t end = text.find(to, start);
    return text.substr(start, end == std::string::npos ? std::string::npos : end - start);
}

void ReadGeoTransform(const std::string& json, GdalReport& report)
{
    std::smatch m;
    const std::string n = std::string("\\s*") + kNumber + "\\s*";
    if (std::regex_search(json, m, std::regex("\"geoTransform\":\\s*\\[" + n + "," + n + "," + n + "," + n + "," +
                                              n + "," + n + "\\]")))
        for (size_t i = 0; i < 6; ++i)
            report.geoTransform[i] = std::stod(m[i + 1]);
}

} // namespace

double GdalReport::X(double column, double row) const
{
    return geoTransform[0] + column * geoTransform[1] + row * geoTransform[2];
}

double GdalReport::Y(double column, double row) const
{
    return geoTransform[3] + column * geoTransform[4] + row * geoTransform[5];
}

GdalReport ReadWithGdal(const std::string& path)
{
    GdalReport report;
    ProcessResult gdal = RunProgram({"gdalinfo", "-json", "-checksum", path});
    const std::string& json = gdal.out;
    std::smatch m;
    if (gdal.exitCode != 0 || !std::regex_search(json, m, std::regex("\"size\":\\s*\\[\\s*(\\d+),\\s*(\\d+)")))
        return report;
    report.read = true;
    report.width = uint32_t(std::stoul(m[1]));
    report.height = uint32_t(std::stoul(m[2]));
    for (const std::smatch& id : AllMatches(json, std::regex("ID\\[\\\\\"EPSG\\\\\",(\\d+)\\]")))
        report.epsg = std::stoi(id[1]);
    ReadGeoTransform(json, report);
    for (const std::smatch& sum : AllMatches(json, std::regex("\"checksum\":\\s*(\\d+)")))
        report.checksums.push_back(uint32_t(std::stoul(sum[1])));
    for (const std::smatch& c : AllMatches(json, std::regex("\"colorInterpretation\":\\s*\"(\\w+)\"")))
        report.colourInterpretations.push_back(c[1]);
    if (std::regex_search(json, m, std::regex(std::string("\"noDataValue\":\\s*") + kNumber))) {
        report.hasNodata = true;
        report.nodata = std::stod(m[1]);
    }
    report.colourTable = Triples(Between(json, "\"entries\"", "}"),
                                 "\\[\\s*(\\d+),\\s*(\\d+),\\s*(\\d+),\\s*\\d+\\s*\\]");
    return report;
}

std::vector<uint32_t> RawChecksums(const std::string& rawPath, uint32_t width, uint32_t height, unsigned bands)
{
    const std::string header = rawPath.substr(0, rawPath.rfind('.')) + ".hdr";
    WriteFile(header, "ENVI\nsamples = " + std::to_string(width) + "\nlines = " + std::to_string(height) +
                          "\nbands = " + std::to_string(bands) +
                          "\nheader offset = 0\nfile type = ENVI Standard\ndata type = 1\n"
                          "interleave = bip\nbyte order = 0\n");
    return ReadWithGdal(rawPath).checksums;
}

HostInfo ReadHostInfo(const std::string& path)
{
    HostInfo info;
    const std::string json = RunHost({"info", path}).out;
    std::smatch m;
    if (std::regex_search(json, m, std::regex("\"epsg\": (\\d+)")))
        info.epsg = std::stoi(m[1]);
    const std::string n = kNumber;
    const std::string points = Between(json, "\"points\"", "]]");
    for (const std::smatch& p : AllMatches(points, std::regex("\\[" + n + ", " + n + ", " + n + ", " + n)))
        info.points.push_back({std::stod(p[1]), std::stod(p[2]), std::stod(p[3]), std::stod(p[4])});
    info.palette = Triples(Between(json, "\"palette\"", "\"georef\""), "\\[(\\d+), (\\d+), (\\d+)\\]");
    return info;
}
