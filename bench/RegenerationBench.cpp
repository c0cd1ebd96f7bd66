// How much the configuration file's regeneration costs beyond touching the driver files at all:
// regenerating over 2,000 driver images, beside only reading every byte of them, in one run. Two
// floors in the same run show what no regeneration can avoid: opening and closing each file, and
// opening it, making exactly the reads and seeks the export reader makes, and closing it.
#include <windows.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "BenchReport.h"
#include "framework/PeExports.h"
#include "sources/ConfigurationFile.h"
#include "sources/ConfigurationPlatform.h"

using namespace sm;

namespace {
constexpr int driverCount = 2000;
constexpr int rounds = 3;

double Seconds(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

std::size_t ReadEveryByte(const std::vector<std::string>& files) {
    std::size_t total = 0;
    std::vector<char> buffer(1 << 16);
    for (const auto& file : files) {
        HANDLE handle = ::CreateFileA(file.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING, 0, nullptr);
        DWORD read = 0;
        while (::ReadFile(handle, buffer.data(), static_cast<DWORD>(buffer.size()), &read, nullptr) && read > 0) total += read;
        ::CloseHandle(handle);
    }
    return total;
}
// The reads the export reader makes in one file, in its order: (offset, bytes asked).
using ReadPattern = std::vector<std::pair<std::uint64_t, std::size_t>>;

// Opens the file as the export reader opens it. Its reads are recorded through the reader's own
// fetch interface, so the floor replays the very reads the product makes, page size included.
ReadPattern RecordReads(const std::string& file) {
    HANDLE handle = ::CreateFileA(file.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                  FILE_ATTRIBUTE_NORMAL, nullptr);
    ReadPattern pattern;
    StringVector names;
    ReadExportNames([&](std::uint64_t offset, std::span<unsigned char> into) -> std::size_t {
        pattern.emplace_back(offset, into.size());
        LARGE_INTEGER to{};
        to.QuadPart = static_cast<LONGLONG>(offset);
        ::SetFilePointerEx(handle, to, nullptr, FILE_BEGIN);
        DWORD read = 0;
        ::ReadFile(handle, into.data(), static_cast<DWORD>(into.size()), &read, nullptr);
        return read;
    }, names);
    ::CloseHandle(handle);
    return pattern;
}

// Floor (a): the open and the close the export reader makes per file, nothing read.
void OpenAndClose(const std::vector<std::string>& files) {
    for (const auto& file : files) {
        HANDLE handle = ::CreateFileA(file.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                      FILE_ATTRIBUTE_NORMAL, nullptr);
        ::CloseHandle(handle);
    }
}

// Floor (b): the open, the recorded reads with the Win32 calls the export reader makes (a seek only
// when a page is not the next one, reads until the page is full or the file ends), and the close;
// none of the parsing.
std::size_t OpenReadAndClose(const std::vector<std::string>& files, const std::vector<ReadPattern>& patterns,
                             std::vector<unsigned char>& buffer) {
    std::size_t total = 0;
    for (std::size_t index = 0; index < files.size(); ++index) {
        HANDLE handle = ::CreateFileA(files[index].c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                      FILE_ATTRIBUTE_NORMAL, nullptr);
        std::uint64_t position = 0;
        for (const auto& [offset, size] : patterns[index]) {
            if (offset != position) {
                LARGE_INTEGER to{};
                to.QuadPart = static_cast<LONGLONG>(offset);
                ::SetFilePointerEx(handle, to, nullptr, FILE_BEGIN);
                position = offset;
            }
            if (buffer.size() < size) buffer.resize(size);
            std::size_t got = 0;
            while (got < size) {
                DWORD wanted = static_cast<DWORD>(size - got), read = 0;
                if (!::ReadFile(handle, buffer.data() + got, wanted, &read, nullptr)) break;
                got += read;
                if (read < wanted) break;
            }
            position += got;
            total += got;
        }
        ::CloseHandle(handle);
    }
    return total;
}

double Best(const std::vector<double>& times) { return *std::min_element(times.begin(), times.end()); }
}  // namespace

int main() {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    std::string root = std::string(temp) + "SessionMgrRegenerationBench";
    std::string platform = root + "\\Win64";
    ::CreateDirectoryA(root.c_str(), nullptr);
    ::CreateDirectoryA(platform.c_str(), nullptr);
    ::SetEnvironmentVariableA("VXIPNPPATH", root.c_str());
    std::vector<std::string> files;
    for (int index = 0; index < driverCount; ++index) {
        // A hundred folders of twenty drivers: the scan walks subfolders too.
        std::string folder = platform + "\\group" + std::to_string(index / 20);
        ::CreateDirectoryA(folder.c_str(), nullptr);
        files.push_back(folder + "\\driver" + std::to_string(index) + ".dll");
        ::CopyFileA(SCAN_STANDARD, files.back().c_str(), FALSE);
    }
    Path file = GetConfigurationFilePath();

    std::vector<ReadPattern> patterns;
    for (const auto& path : files) patterns.push_back(RecordReads(path));
    std::size_t readsPerFile = patterns.front().size();

    std::vector<double> regeneration, reading, listing, exporting, openClose, openReadClose;
    std::vector<unsigned char> buffer;
    std::size_t bytes = 0, floorBytes = 0;
    for (int round = 0; round < rounds; ++round) {
        auto start = std::chrono::steady_clock::now();
        RegenerateConfigurationFile(file);
        regeneration.push_back(Seconds(start));
        start = std::chrono::steady_clock::now();
        bytes = ReadEveryByte(files);
        reading.push_back(Seconds(start));
        // The two parts of the scan on their own: listing the folders, reading the export names.
        start = std::chrono::steady_clock::now();
        std::vector<std::string> listed;
        configuration::ListDllFiles(platform, listed);
        listing.push_back(Seconds(start));
        start = std::chrono::steady_clock::now();
        for (const auto& path : listed) {
            StringVector names;
            ReadDLLExports(path, names);
        }
        exporting.push_back(Seconds(start));
        start = std::chrono::steady_clock::now();
        OpenAndClose(files);
        openClose.push_back(Seconds(start));
        start = std::chrono::steady_clock::now();
        floorBytes = OpenReadAndClose(files, patterns, buffer);
        openReadClose.push_back(Seconds(start));
    }
    double regenerate = Best(regeneration);
    double read = Best(reading);
    std::printf("drivers: %d (%zu bytes), best of %d rounds\n", driverCount, bytes, rounds);
    std::printf("regenerate configuration file: %.3f s\n", regenerate);
    std::printf("read every byte of the drivers: %.3f s\n", read);
    std::printf("ratio regenerate/read: %.2f\n", regenerate / read);
    std::printf("NOTE|P5 parts: listing the folders %.3f s, reading the export names of every image %.3f s\n",
                *std::min_element(listing.begin(), listing.end()), *std::min_element(exporting.begin(), exporting.end()));
    char figure[32], reference[32];
    std::snprintf(figure, sizeof figure, "%.3f s", regenerate);
    std::snprintf(reference, sizeof reference, "%.3f s", read);
    bench::Row("P5", "regenerating the configuration file, 2,000 images in 100 folders", figure,
               "reading every byte of the same files", reference, regenerate / read, "<= 1.0");

    double list = Best(listing), opened = Best(openClose), pages = Best(openReadClose);
    std::printf("NOTE|P5 floor (a) opening and closing each of the 2,000 files: %.3f s; (b) the same with the "
                "export reader's %zu read(s) per file (%zu bytes in all): %.3f s; listing the folders: %.3f s\n",
                opened, readsPerFile, floorBytes, pages, list);
    std::printf("NOTE|P5 the product's own work over the floor (regeneration - listing - floor b): %.3f s = %.2f of "
                "the reference; the floor alone (listing + b) is %.2f of the reference\n",
                regenerate - list - pages, (regenerate - list - pages) / read, (list + pages) / read);
    char floorValue[32];
    std::snprintf(floorValue, sizeof floorValue, "%.3f s", opened);
    bench::Row("P5.a", "floor: opening and closing each of the same 2,000 files", floorValue,
               "reading every byte of the same files", reference, opened / read, "-");
    std::snprintf(floorValue, sizeof floorValue, "%.3f s", pages);
    bench::Row("P5.b", "floor: opening, the export reader's reads, closing", floorValue,
               "reading every byte of the same files", reference, pages / read, "-");
    std::snprintf(floorValue, sizeof floorValue, "%.3f s", list + pages);
    bench::Row("P5.c", "floor: listing the folders + floor b", floorValue, "reading every byte of the same files",
               reference, (list + pages) / read, "-");
    return 0;
}
