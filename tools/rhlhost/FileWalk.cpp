#include "FileWalk.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <map>
#include <set>

namespace host {
namespace {

namespace fs = std::filesystem;

void WalkDirectory(const fs::path& root, std::vector<InputFile>& files, std::vector<std::string>& problems)
{
    std::error_code error;
    const auto options = fs::directory_options::skip_permission_denied;
    fs::recursive_directory_iterator it(root, options, error);
    const size_t first = files.size();
    for (; !error && it != fs::recursive_directory_iterator(); it.increment(error)) {
        std::error_code typeError;
        if (it->is_regular_file(typeError))
            files.push_back({it->path().string(), it->path().lexically_relative(root).string()});
    }
    if (error)
        problems.push_back("cannot read the directory " + root.string() + ": " + error.message());
    std::sort(files.begin() + first, files.end(),
              [](const InputFile& a, const InputFile& b) { return a.path < b.path; });
}

} // namespace

std::string Folded(std::string name)
{
    std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
    return name;
}

std::vector<InputFile> CollectInputs(const std::vector<std::string>& inputs, std::vector<std::string>& problems)
{
    std::vector<InputFile> files;
    for (const std::string& input : inputs) {
        std::error_code error;
        if (fs::is_directory(input, error))
            WalkDirectory(input, files, problems);
        else
            files.push_back({input, fs::path(input).filename().string(), true});
    }
    return files;
}

std::vector<std::string> UniqueNames(const std::vector<InputFile>& files)
{
    std::set<std::string> own, given;
    for (const InputFile& file : files)
        own.insert(Folded(file.name));
    std::map<std::string, size_t> nextSuffix;
    std::vector<std::string> names;
    for (const InputFile& file : files) {
        std::string name = file.name;
        size_t& suffix = nextSuffix.emplace(Folded(name), 2).first->second;
        while (given.count(Folded(name)) > 0 || (name != file.name && own.count(Folded(name)) > 0))
            name = file.name + "-" + std::to_string(suffix++);
        given.insert(Folded(name));
        names.push_back(std::move(name));
    }
    return names;
}

} // namespace host
