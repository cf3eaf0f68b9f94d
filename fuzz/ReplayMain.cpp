// The main of a fuzz target outside libFuzzer: replays inputs (files, or the
// files of a folder; an absent folder holds none) through the target under
// the limits of a campaign, given as libFuzzer takes them:
//   fuzz_TARGET [-timeout=S] [-rss_limit_mb=M] [-malloc_limit_mb=M] FILE_OR_FOLDER...
// An allocation above the malloc limit (the RSS limit when none is given), a
// unit running past the timeout or a peak resident set above the RSS limit
// ends the run with a failure that names the input, as in a campaign.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <signal.h>
#include <string>
#include <sys/resource.h>
#include <unistd.h>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

size_t mallocLimit = 0; // bytes; 0: none
unsigned long timeoutSeconds = 0;
char currentInput[4096] = "";

[[noreturn]] void Fail(const char* what, unsigned long long amount)
{
    char line[sizeof currentInput + 128];
    const int length = std::snprintf(line, sizeof line, "fuzz replay: %s: %s %llu\n", currentInput, what, amount);
    const ssize_t written = write(2, line, size_t(std::max(length, 0)));
    _exit(written < 0 ? 2 : 1);
}

void CheckAllocation(size_t size)
{
    if (mallocLimit != 0 && size > mallocLimit)
        Fail("out-of-memory: one allocation of (bytes)", size);
}

} // namespace

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
// The sanitizer owns malloc; its hooks see every allocation, as libFuzzer's do.
extern "C" int __sanitizer_install_malloc_and_free_hooks(void (*)(const volatile void*, size_t),
                                                         void (*)(const volatile void*));
static void InstallAllocationCheck()
{
    __sanitizer_install_malloc_and_free_hooks([](const volatile void*, size_t size) { CheckAllocation(size); },
                                              [](const volatile void*) {});
}
#else
// glibc's allocator behind a checked malloc, calloc and realloc, visible to
// the shared libraries (libjpeg, libtiff, libstdc++) too.
extern "C" {
void* __libc_malloc(size_t);
void* __libc_calloc(size_t, size_t);
void* __libc_realloc(void*, size_t);
__attribute__((visibility("default"))) void* malloc(size_t size) noexcept
{
    CheckAllocation(size);
    return __libc_malloc(size);
}
__attribute__((visibility("default"))) void* calloc(size_t count, size_t size) noexcept
{
    size_t total = 0;
    CheckAllocation(__builtin_mul_overflow(count, size, &total) ? SIZE_MAX : total);
    return __libc_calloc(count, size);
}
__attribute__((visibility("default"))) void* realloc(void* block, size_t size) noexcept
{
    CheckAllocation(size);
    return __libc_realloc(block, size);
}
}
static void InstallAllocationCheck() {}
#endif

int main(int argc, char** argv)
{
    namespace fs = std::filesystem;
    unsigned long rssLimitMb = 0, mallocLimitMb = 0;
    std::vector<fs::path> inputs;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        if (std::sscanf(argv[i], "-timeout=%lu", &timeoutSeconds) == 1 ||
            std::sscanf(argv[i], "-rss_limit_mb=%lu", &rssLimitMb) == 1 ||
            std::sscanf(argv[i], "-malloc_limit_mb=%lu", &mallocLimitMb) == 1)
            continue;
        if (arg[0] == '-') {
            std::fprintf(stderr, "usage: %s [-timeout=S] [-rss_limit_mb=M] [-malloc_limit_mb=M] FILE_OR_FOLDER...\n",
                         argv[0]);
            return 2;
        }
        const size_t first = inputs.size();
        if (fs::is_directory(arg))
            for (const fs::directory_entry& entry : fs::directory_iterator(arg))
                inputs.push_back(entry.path());
        else if (fs::exists(arg))
            inputs.push_back(arg);
        std::sort(inputs.begin() + long(first), inputs.end());
    }
    mallocLimit = size_t(mallocLimitMb ? mallocLimitMb : rssLimitMb) << 20;
    InstallAllocationCheck();
    signal(SIGALRM, [](int) { Fail("timeout: a unit ran longer than (seconds)", timeoutSeconds); });
    for (const fs::path& input : inputs) {
        std::snprintf(currentInput, sizeof currentInput, "%s", input.c_str());
        std::ifstream in(input, std::ios::binary);
        std::vector<uint8_t> data((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        data.push_back(0); // data() is never null, even for an empty input
        alarm(unsigned(timeoutSeconds));
        LLVMFuzzerTestOneInput(data.data(), data.size() - 1);
        alarm(0);
        struct rusage usage {};
        getrusage(RUSAGE_SELF, &usage);
        if (rssLimitMb != 0 && static_cast<unsigned long>(usage.ru_maxrss) > rssLimitMb << 10)
            Fail("out-of-memory: peak resident set (kB)", (unsigned long long)usage.ru_maxrss);
    }
    std::printf("%zu inputs replayed\n", inputs.size());
    return 0;
}
