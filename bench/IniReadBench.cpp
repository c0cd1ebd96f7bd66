// How fast IniObj reads a large file, against Debian's libinih reading the same file in the same
// run. IniObj builds the whole document (sections, items, joined split values, quotes removed);
// libinih only calls back per item, so it is timed twice: with a callback that builds an equivalent
// document (comparable work) and with one that only counts (its raw parsing speed).
//
// Build it in an optimised tree without sanitizers (see docs/benchmarks.md); numbers from the
// sanitized test build mean nothing.
#include <ini.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "BenchReport.h"
#include "framework/IniObj.h"

namespace {

constexpr std::size_t targetBytes = 10u * 1024u * 1024u;
constexpr int rounds = 7;

// Sections of mixed items as a configuration file holds them: comments, quoted escaped paths,
// booleans, numbers, blank lines and values long enough to be split into numbered pieces. Every
// line stays below 200 bytes, libinih's line limit in its Debian build.
std::string GenerateText() {
    std::string text;
    text.reserve(targetBytes + 4096);
    for (unsigned section = 0; text.size() < targetBytes; ++section) {
        text += ";; Virtual instrument " + std::to_string(section) + "\r\n";
        text += "[VPPVInstr->Driver" + std::to_string(section) + "]\r\n";
        text += "ModulePath = \"C:\\\\Program Files\\\\IVI Foundation\\\\VISA\\\\Win64\\\\Bin\\\\drv" +
                std::to_string(section) + "_64.dll\"\r\n";
        text += "Prefix = \"drv" + std::to_string(section) + "\"\r\n";
        text += "Resource = \"GPIB0::" + std::to_string(section % 31) + "::INSTR\"\r\n";
        text += "IDQuery = True\r\nReset = False\r\n";
        for (unsigned item = 0; item < 6; ++item)
            text += "Setting" + std::to_string(item) + " = " + std::to_string(section * 7919u + item) + "\r\n";
        std::string piece(120, static_cast<char>('a' + section % 26));
        text += "Description Line0001 = " + piece + "\r\nDescription Line0002 = " + piece.substr(0, 40) + "\r\n";
        text += "\r\n";
    }
    return text;
}

struct Section {
    std::string name;
    std::vector<std::pair<std::string, std::string>> items;
};

int BuildDocument(void* user, const char* section, const char* name, const char* value) {
    auto& sections = *static_cast<std::vector<Section>*>(user);
    if (sections.empty() || sections.back().name != section) sections.push_back(Section{section, {}});
    sections.back().items.emplace_back(name, value);
    return 1;
}

int CountOnly(void* user, const char*, const char*, const char*) {
    ++*static_cast<std::size_t*>(user);
    return 1;
}

template <class Body>
double BestSeconds(Body body) {
    std::vector<double> times;
    for (int round = 0; round < rounds; ++round) {
        auto start = std::chrono::steady_clock::now();
        body();
        times.push_back(std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
    }
    return *std::min_element(times.begin(), times.end());
}

}  // namespace

int main() {
#if defined(__SANITIZE_ADDRESS__)
    std::printf("warning: built with sanitizers; the figures below are not meaningful\n");
#endif
    std::string text = GenerateText();
    std::filesystem::path file = std::filesystem::temp_directory_path() / "IniReadBench.ini";
    std::ofstream(file, std::ios::binary) << text;
    const double megabytes = static_cast<double>(text.size()) / (1024.0 * 1024.0);

    std::size_t ourSections = 0, ourItems = 0;
    double ours = BestSeconds([&] {
        sm::IniObj ini;
        ini.ReadFile(file.string());
        ourSections = ini.GetSections().size();
        ourItems = 0;
        for (const auto& section : ini.GetSections()) ourItems += section.items.size();
    });

    std::size_t inihSections = 0, inihItems = 0;
    int failure = 0;
    double inihDocument = BestSeconds([&] {
        std::vector<Section> sections;
        failure = ini_parse(file.string().c_str(), BuildDocument, &sections);
        inihSections = sections.size();
        inihItems = 0;
        for (const auto& section : sections) inihItems += section.items.size();
    });
    std::size_t counted = 0;
    double inihCount = BestSeconds([&] {
        counted = 0;
        ini_parse(file.string().c_str(), CountOnly, &counted);
    });
    std::filesystem::remove(file);

    std::printf("file: %.1f MB, best of %d rounds each\n", megabytes, rounds);
    std::printf("IniObj::ReadFile           %8.1f MB/s  (%zu sections, %zu items after joining split values)\n",
                megabytes / ours, ourSections, ourItems);
    std::printf("libinih, building document %8.1f MB/s  (%zu sections, %zu items; parse result %d)\n",
                megabytes / inihDocument, inihSections, inihItems, failure);
    std::printf("libinih, counting only     %8.1f MB/s  (%zu items)\n", megabytes / inihCount, counted);
    std::printf("ratio IniObj / libinih building document: %.2f\n", inihDocument / ours);
    std::printf("ratio IniObj / libinih counting only:     %.2f\n", inihCount / ours);
    char figure[32], reference[32];
    std::snprintf(figure, sizeof figure, "%.1f MB/s", megabytes / ours);
    std::snprintf(reference, sizeof reference, "%.1f MB/s", megabytes / inihDocument);
    bench::Row("P4", "IniObj reading a 10 MB file (native, speed)", figure, "libinih building the same document",
               reference, inihDocument / ours, ">= 1.5");
    return failure == 0 ? 0 : 1;
}
