#include "tests/GdalPeer.h"

#include "tests/fixtures/Command.h"
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <algorithm>
#include <regex>

std::vector<std::vector<double>> NumbersIn(const std::string& text, const std::string& pattern)
{
    std::vector<std::vector<double>> found;
    const std::regex expression(pattern);
    for (std::sregex_iterator it(text.begin(), text.end(), expression), end; it != end; ++it) {
        found.emplace_back();
        for (size_t group = 1; group < it->size(); ++group)
            found.back().push_back(std::stod((*it)[group]));
    }
    return found;
}

GdalReport ReadWithGdal(const std::string& path)
{
    GdalReport report;
    int status = 0;
    const std::string json = RunCommand("gdalinfo -json -checksum '" + path + "'", &status);
    const std::string n = "\\s*([-+0-9.eE]+)\\s*";
    const auto size = NumbersIn(json, "\"size\":\\s*\\[\\s*(\\d+),\\s*(\\d+)");
    if (status != 0 || size.empty())
        return report;
    report.read = true;
    report.width = uint32_t(size[0][0]);
    report.height = uint32_t(size[0][1]);
    for (const auto& id : NumbersIn(json, "ID\\[\\\\\"EPSG\\\\\",(\\d+)\\]"))
        report.epsg = int(id[0]);
    std::smatch m;
    if (std::regex_search(json, m, std::regex("UTM zone (\\d+)([NS])"))) // named without a code in NITF
        report.epsg = (m[2] == "N" ? 32600 : 32700) + std::stoi(m[1]);
    for (const auto& t : NumbersIn(json, "\"geoTransform\":\\s*\\[" + n + "," + n + "," + n + "," + n + "," + n + "," +
                                             n + "\\]"))
        std::copy(t.begin(), t.end(), report.geoTransform.begin());
    const auto block = NumbersIn(json, "\"block\":\\s*\\[\\s*(\\d+),\\s*(\\d+)");
    if (!block.empty())
        report.block = {uint32_t(block[0][0]), uint32_t(block[0][1])};
    // Overviews (objects of a size and a checksum) set apart from the bands' own checksums.
    const std::regex overviews("\"overviews\":\\s*\\[(\\s*\\{[^{}]*\\}\\s*,?)*\\s*\\]");
    if (std::regex_search(json, m, overviews))
        report.overviews = size_t(std::count(m[0].first, m[0].second, '{'));
    for (const auto& sum : NumbersIn(std::regex_replace(json, overviews, ""), "\"checksum\":\\s*(\\d+)"))
        report.checksums.push_back(uint32_t(sum[0]));
    const std::regex colour("\"colorInterpretation\":\\s*\"(\\w+)\"");
    for (std::sregex_iterator it(json.begin(), json.end(), colour), end; it != end; ++it)
        report.colourInterpretations.push_back((*it)[1]);
    for (const auto& value : NumbersIn(json, "\"noDataValue\":" + n))
        report.hasNodata = true, report.nodata = value[0];
    const size_t entries = json.find("\"entries\"");
    const std::string table =
        entries == std::string::npos ? "" : json.substr(entries, json.find('}', entries) - entries);
    for (const auto& e : NumbersIn(table, "\\[\\s*(\\d+),\\s*(\\d+),\\s*(\\d+),\\s*\\d+\\s*\\]"))
        report.colourTable.push_back({int(e[0]), int(e[1]), int(e[2])});
    return report;
}

std::string GdalSamples(const std::string& path, const std::string& options)
{
    TempDirectory directory;
    RunCommand("gdal_translate -q -of ENVI -co INTERLEAVE=BIP " + options + " '" + path + "' " + (directory / "samples.raw"));
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
