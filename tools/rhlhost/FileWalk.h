// The files a batch or mosaic works on: files named on the command line and
// every regular file below the directories named there.
#pragma once

#include <string>
#include <vector>

namespace host {

struct InputFile {
    std::string path;
    std::string name; // relative to the directory it was found in; a named file's own name
    bool named = false; // named on the command line, not found in a directory
};

// Directories are walked recursively and their files sorted; a named path that
// is not a directory is kept as it is, even when it does not exist, so that
// the caller reports it. Directories that cannot be read become problems.
std::vector<InputFile> CollectInputs(const std::vector<std::string>& inputs, std::vector<std::string>& problems);

// The files' names made unique, in the files' order: a name claimed a second
// time becomes the first free NAME-2, NAME-3, ..., never another file's own
// name. Names that differ only in case are one name: an output folder may
// ignore case.
std::vector<std::string> UniqueNames(const std::vector<InputFile>& files);

// The name in lower case, for comparing names that may differ only in case.
std::string Folded(std::string name);

} // namespace host
