// An output written under a temporary name beside its final one and renamed
// only when complete, so that no partial file ever carries the final name.
#pragma once

#include <string>

namespace host {

class OutputFile {
public:
    explicit OutputFile(std::string finalPath);
    // Removes the temporary file unless Commit succeeded.
    ~OutputFile();
    OutputFile(const OutputFile&) = delete;
    OutputFile& operator=(const OutputFile&) = delete;

    const std::string& TemporaryPath() const { return temporary_; }
    // Renames the temporary file to the final name; false with a message.
    bool Commit(std::string& message);

private:
    std::string final_;
    std::string temporary_;
    bool committed_ = false;
};

// "cannot write PATH: REASON" from errno.
std::string CannotWrite(const std::string& path);

} // namespace host
