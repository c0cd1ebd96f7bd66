// Owner of a C runtime FILE stream, so no path through the framework leaks an open file.
#pragma once

#include <cstdio>
#include <memory>

namespace sm {

struct FileCloser {
    void operator()(std::FILE* file) const { std::fclose(file); }
};
using UniqueFile = std::unique_ptr<std::FILE, FileCloser>;

}  // namespace sm
