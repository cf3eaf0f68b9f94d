#include "tests/GdalPeer.h"

#include "tests/fixtures/Command.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <regex>

namespace {

const std::string kNumber = "\\s*([-+0-9.eE]+)\\s*";

std::vector<std::smatch> AllMatches(const std::string& text, const std::string& pattern)
{
    std::vector<std::smatch> matches;
    const std::regex expression(pattern);
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it)
        matches.push_back(*it);
    return matches;
}

} // namespace

GdalReport ReadWithGdal(const std::string& path)
{
    GdalReport report;
    int status = 0;
    const std::string json = RunCommand("gdalinfo -json -checksum '" + path + "'", &status);
    std::smatch m;
    if (status != 0 || !std::regex_search(json, m, std::regex("\"size\":\\s*\\[\\s*(\\d+),\\s*(\\d+)")))
        return report;
    report.read = true;
    report.width = uint32_t(std::stoul(m[1]));
    report.height = uint32_t(std::stoul(m[2]));
    for (const std::smatch& id : AllMatches(json, "ID\\[\\\\\"EPSG\\\\\",(\\d+)\\]"))
        report.epsg = std::stoi(id[1]);
    if (std::regex_search(json, m, std::regex("UTM zone (\\d+)([NS])"))) // named without a code in NITF
        report.epsg = (m[2] == "N" ? 32600 : 32700) + std::stoi(m[1]);
    const auto transform = AllMatches(json,
                                      "\"geoTransform\":\\s*\\[" + kNumber + "," + kNumber + "," + kNumber + "," +
                                          kNumber + "," + kNumber + "," + kNumber + "\\]");
    for (size_t i = 0; !transform.empty() && i < 6; ++i)
        report.geoTransform[i] = std::stod(transform[0][i + 1]);
    for (const std::smatch& sum : AllMatches(json, "\"checksum\":\\s*(\\d+)"))
        report.checksums.push_back(uint32_t(std::stoul(sum[1])));
    for (const std::smatch& c : AllMatches(json, "\"colorInterpretation\":\\s*\"(\\w+)\""))
        report.colourInterpretations.push_back(c[1]);
    if ((report.hasNodata = std::regex_search(json, m, std::regex("\"noDataValue\":" + kNumber))))
        report.nodata = std::stod(m[1]);
    const size_t entries = json.find("\"entries\"");
    const std::string table =
        entries == std::string::npos ? "" : json.substr(entries, json.find('}', entries) - entries);
    for (const std::smatch& e : AllMatches(table, "\\[\\s*(\\d+),\\s*(\\d+),\\s*(\\d+),\\s*\\d+\\s*\\]"))
        report.colourTable.push_back({std::stoi(e[1]), std::stoi(e[2]), std::stoi(e[3])});
    return report;
}

std::string GdalSamples(const std::string& path, const std::string& options)
{
    TempDirectory directory;
    RunCommand("gdal_translate -q -of ENVI " + options + " '" + path + "' " + (directory / "samples.raw"));
    return ReadWholeFile(directory / "samples.raw");
}

uint32_t GdalChecksum(const uint8_t* pixels, uint32_t width, uint32_t height, size_t stride)
{
    static const uint32_t primes[] = {7, 11, 13, 17, 19, 23, 29, 31, 37, 41, 43};
    uint32_t sum = 0;
    size_t prime = 0;
    for (size_t i = 0; i < size_t(width) * height; ++i) {
        sum += pixels[i * stride] % primes[prime];
        prime = (prime + 1) % 11;
        if ((i + 1) % width == 0)
            sum &= 0xFFFF;
    }
    return sum;
}
