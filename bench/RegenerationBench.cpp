// How much the configuration file's regeneration costs beyond touching the driver files at all:
// regenerating over 2,000 driver images, beside only reading every byte of them, in one run.
#include <windows.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <string>
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

    std::vector<double> regeneration, reading, listing, exporting;
    std::size_t bytes = 0;
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
    }
    double regenerate = *std::min_element(regeneration.begin(), regeneration.end());
    double read = *std::min_element(reading.begin(), reading.end());
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
    return 0;
}
