// The main of a fuzz target outside libFuzzer: replays inputs (files, or the files of a folder; an absent folder
// holds none) under a campaign's limits, given as libFuzzer takes them:
//   fuzz_TARGET [-timeout=S] [-rss_limit_mb=M] [-malloc_limit_mb=M] FILE_OR_FOLDER...
// One allocation above the malloc limit (the RSS limit when none is given), a unit running past the timeout or a peak
// resident set above the RSS limit fails the run, naming the input.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

unsigned long timeoutSeconds = 0, rssLimitMb = 0, mallocLimitMb = 0;
size_t mallocLimit = 0; // bytes; 0 until the inputs run
char input[4096] = "";

[[noreturn]] void Fail(const char* what, unsigned long long amount)
{
    char line[sizeof input + 128];
    const int length = std::snprintf(line, sizeof line, "fuzz replay: %s: %s %llu\n", input, what, amount);
    _exit(write(2, line, size_t(std::max(length, 0))) < 0 ? 2 : 1);
}

void CheckAllocation(size_t size)
{
    if (mallocLimit != 0 && size > mallocLimit)
        Fail("out-of-memory: one allocation of (bytes)", size);
}

} // namespace

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__) // gcc
#define VX_SANITIZER_OWNS_MALLOC 1
#elif defined(__has_feature) // clang
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define VX_SANITIZER_OWNS_MALLOC 1
#endif
#endif
#ifdef VX_SANITIZER_OWNS_MALLOC
// The sanitizer owns malloc; its hooks see every allocation, as libFuzzer's do.
extern "C" int __sanitizer_install_malloc_and_free_hooks(void (*)(const volatile void*, size_t),
                                                         void (*)(const volatile void*));
static const int installed = __sanitizer_install_malloc_and_free_hooks(
    [](const volatile void*, size_t size) { CheckAllocation(size); }, [](const volatile void*) {});
#else
// glibc's allocator behind a checked malloc, calloc and realloc, which the
// shared libraries (libjpeg, libtiff, libstdc++) call too.
extern "C" {
void* __libc_malloc(size_t);
void* __libc_calloc(size_t, size_t);
void* __libc_realloc(void*, size_t);
__attribute__((visibility("default"))) void* malloc(size_t size) noexcept
{
    return CheckAllocation(size), __libc_malloc(size);
}
__attribute__((visibility("default"))) void* calloc(size_t count, size_t size) noexcept
{
    size_t total = SIZE_MAX;
    return CheckAllocation(__builtin_mul_overflow(count, size, &total) ? SIZE_MAX : total), __libc_calloc(count, size);
}
__attribute__((visibility("default"))) void* realloc(void* block, size_t size) noexcept
{
    return CheckAllocation(size), __libc_realloc(block, size);
}
}
#endif

int main(int argc, char** argv)
{
    namespace fs = std::filesystem;
    std::vector<fs::path> inputs;
    for (int i = 1; i < argc; ++i) {
        if (std::sscanf(argv[i], "-timeout=%lu", &timeoutSeconds) == 1 ||
            std::sscanf(argv[i], "-rss_limit_mb=%lu", &rssLimitMb) == 1 ||
            std::sscanf(argv[i], "-malloc_limit_mb=%lu", &mallocLimitMb) == 1)
            continue;
        if (argv[i][0] == '-')
            return std::fprintf(stderr, "%s: unknown option %s\n", argv[0], argv[i]), 2;
        const size_t first = inputs.size();
        if (fs::is_directory(argv[i]))
            std::copy(fs::directory_iterator(argv[i]), fs::directory_iterator(), std::back_inserter(inputs));
        else if (fs::exists(argv[i]))
            inputs.push_back(argv[i]);
        std::sort(inputs.begin() + long(first), inputs.end());
    }
    signal(SIGALRM, [](int) { Fail("timeout: a unit ran longer than (seconds)", timeoutSeconds); });
    for (const fs::path& path : inputs) {
        std::snprintf(input, sizeof input, "%s", path.c_str());
        std::ifstream in(path, std::ios::binary);
        std::vector<uint8_t> data((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        data.push_back(0); // data() is never null, even for an empty input
        mallocLimit = size_t(mallocLimitMb ? mallocLimitMb : rssLimitMb) << 20;
        alarm(unsigned(timeoutSeconds));
        LLVMFuzzerTestOneInput(data.data(), data.size() - 1);
        alarm(0);
        mallocLimit = 0;
        struct rusage usage { };
        if (getrusage(RUSAGE_SELF, &usage) == 0 && rssLimitMb != 0 &&
            static_cast<unsigned long>(usage.ru_maxrss) > rssLimitMb << 10)
            Fail("out-of-memory: peak resident set (kB)", static_cast<unsigned long long>(usage.ru_maxrss));
    }
    std::printf("%zu inputs replayed\n", inputs.size());
    return 0;
}
