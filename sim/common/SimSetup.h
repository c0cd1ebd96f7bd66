// The simulated bench, shared by every stand-in library. One readable INI file describes all the
// instruments, drivers, configuration stores and switch routes that the stand-ins pretend to have;
// docs/simulated-setup.md documents its sections and keys.
//
// The file is named by the environment variable SM_SIM_SETUP; without it, "simsetup.ini" beside the
// stand-in DLL that asks. It is read again whenever its path, size or write time changes, so a test
// or a user can edit it between two calls without restarting the process.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace sim {

using Entries = std::vector<std::pair<std::string, std::string>>;

struct Section {
    std::string name;   // as written, e.g. "VISA GPIB0::14::INSTR"
    Entries entries;    // in file order, keys and values trimmed, outer quotes removed
};

class Setup {
public:
    // The current content of the setup file; an absent or unreadable file reads as empty.
    static Setup Current();

    // Sections whose name is `area` alone or `area` followed by a blank and an object name; the
    // object names come back in file order. Compares without regard to case.
    std::vector<std::string> Objects(const std::string& area) const;

    // The section "area" (object empty) or "area object"; nullptr when absent.
    const Section* Find(const std::string& area, const std::string& object = "") const;

    std::string Get(const std::string& area, const std::string& object, const std::string& key,
                    const std::string& fallback = "") const;
    long GetLong(const std::string& area, const std::string& object, const std::string& key,
                 long fallback = 0) const;
    bool Has(const std::string& area, const std::string& object, const std::string& key) const;

    // Shared by every copy: Current() hands out the cached file without copying it.
    std::shared_ptr<const std::vector<Section>> sections = std::make_shared<std::vector<Section>>();
    std::string path;
};

bool EqualNoCase(const std::string& a, const std::string& b);
// Splits a comma-separated list, trimming each item; empty items are dropped.
std::vector<std::string> SplitList(const std::string& text);
// Numbers as written in the file: decimal, or hexadecimal with 0x (0xBFFF0011 is read as its
// signed 32-bit value, as VISA and IVI statuses are).
long ParseNumber(const std::string& text, long fallback = 0);

// Process-wide call counters that tests read through the stand-in's exported SimCounter. Every
// stand-in also keeps "open": the handles it gave out that nobody has closed (a step of -1 closes).
void Count(const std::string& name, long step = 1);
long Counter(const std::string& name);
void ResetCounters();

}  // namespace sim
