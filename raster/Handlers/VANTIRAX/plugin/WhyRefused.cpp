// WhyRefused: RH_Open's steps on a handle of the library's own, for the
// tools that say why a file is not served. The handler library does not
// link it (no export calls it).
#include "plugin/RasterHandler.h"

#include <filesystem>
#include <system_error>

namespace {

Refusal OpenRefusal(const char* path)
{
    CRasterHandler handler(path);
    RHHandle handle{};
    int32_t result = 0;
    try {
        result = handler.OpenImage(&handle);
    } catch (...) {
        result = 0; // a branch's failure code, as RH_Open catches it
    }
    ReleaseHandleRecords(&handle);
    if (result == 1 && handle.status == kStatusOk)
        return Refusal::kNone;
    return handler.refusal != Refusal::kNone ? handler.refusal : Refusal::kUnexpected;
}

} // namespace

Refusal WhyRefused(const char* path)
{
    std::error_code error;
    const std::filesystem::file_status status = std::filesystem::status(path, error);
    if (!std::filesystem::exists(status))
        return Refusal::kNoSuchFile;
    if (!std::filesystem::is_regular_file(status))
        return Refusal::kNotRegularFile;
    try {
        return OpenRefusal(path);
    } catch (...) {
        return Refusal::kUnexpected;
    }
}
