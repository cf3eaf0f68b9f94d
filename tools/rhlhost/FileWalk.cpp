#include "FileWalk.h"

#include <algorithm>
#include <filesystem>

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

std::vector<InputFile> CollectInputs(const std::vector<std::string>& inputs, std::vector<std::string>& problems)
{
    std::vector<InputFile> files;
    for (const std::string& input : inputs) {
        std::error_code error;
        if (fs::is_directory(input, error))
            WalkDirectory(input, files, problems);
        else
            files.push_back({input, fs::path(input).filename().string()});
    }
    return files;
}

} // namespace host
