// A folder of its own for one test, under the temporary folder, removed with everything in it.
#pragma once

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

namespace sm::testing {

class TempFolder {
public:
    explicit TempFolder(const std::string& prefix = "SessionMgrTest") {
        static std::atomic<int> counter{0};
        path = (std::filesystem::temp_directory_path() /
                (prefix + "-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()) + "-" +
                 std::to_string(++counter)))
                   .string();
        std::filesystem::create_directories(path);
    }
    ~TempFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(path, ignored);
    }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    // Writes a file (folders on the way are made) and gives its full path.
    std::string Write(const std::string& relative, const std::string& bytes) const {
        std::filesystem::path file = std::filesystem::path(path) / relative;
        std::filesystem::create_directories(file.parent_path());
        std::ofstream(file, std::ios::binary | std::ios::trunc) << bytes;
        return file.string();
    }
    std::string Folder(const std::string& relative) const {
        std::filesystem::path folder = std::filesystem::path(path) / relative;
        std::filesystem::create_directories(folder);
        return folder.string();
    }

    std::string path;
};

inline std::string ReadFileBytes(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

}  // namespace sm::testing
