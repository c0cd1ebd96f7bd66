#include "SimSetup.h"

#include <windows.h>

#include <cctype>
#include <cstdlib>
#include <fstream>
#include <map>
#include <mutex>

namespace sim {
namespace {

std::mutex& StateLock() {
    static std::mutex lock;
    return lock;
}

std::string Trim(const std::string& text) {
    std::size_t first = text.find_first_not_of(" \t\r\n");
    if (first == std::string::npos) return {};
    std::size_t last = text.find_last_not_of(" \t\r\n");
    return text.substr(first, last - first + 1);
}

std::string Unquote(const std::string& text) {
    if (text.size() >= 2 && text.front() == '"' && text.back() == '"') return text.substr(1, text.size() - 2);
    return text;
}

// The stand-in that links this file: its own directory is where the default setup file lives.
std::string ModuleDirectory() {
    HMODULE self = nullptr;
    ::GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                         reinterpret_cast<LPCSTR>(&ModuleDirectory), &self);
    char path[MAX_PATH] = {};
    DWORD length = ::GetModuleFileNameA(self, path, MAX_PATH);
    std::string text(path, length);
    std::size_t slash = text.find_last_of("\\/");
    return slash == std::string::npos ? std::string(".") : text.substr(0, slash);
}

std::string SetupPath() {
    char buffer[32768] = {};
    DWORD length = ::GetEnvironmentVariableA("SM_SIM_SETUP", buffer, sizeof buffer);
    if (length > 0 && length < sizeof buffer) return std::string(buffer, length);
    return ModuleDirectory() + "\\simsetup.ini";
}

struct Stamp {
    std::string path;
    ULONGLONG size = 0;
    FILETIME written{};
    bool exists = false;
    bool operator==(const Stamp& other) const {
        return path == other.path && exists == other.exists && size == other.size &&
               ::CompareFileTime(&written, &other.written) == 0;
    }
};

Stamp StampOf(const std::string& path) {
    Stamp stamp;
    stamp.path = path;
    WIN32_FILE_ATTRIBUTE_DATA data{};
    if (::GetFileAttributesExA(path.c_str(), GetFileExInfoStandard, &data)) {
        stamp.exists = true;
        stamp.size = (ULONGLONG(data.nFileSizeHigh) << 32) | data.nFileSizeLow;
        stamp.written = data.ftLastWriteTime;
    }
    return stamp;
}

Setup Read(const std::string& path) {
    auto sections = std::make_shared<std::vector<Section>>();
    Setup setup;
    setup.path = path;
    std::ifstream file(path, std::ios::binary);
    std::string line;
    Section* current = nullptr;
    while (std::getline(file, line)) {
        line = Trim(line);
        if (line.empty() || line[0] == ';' || line[0] == '#') continue;
        if (line.front() == '[' && line.back() == ']') {
            sections->push_back({Trim(line.substr(1, line.size() - 2)), {}});
            current = &sections->back();
            continue;
        }
        std::size_t equals = line.find('=');
        if (!current || equals == std::string::npos) continue;
        current->entries.emplace_back(Trim(line.substr(0, equals)), Unquote(Trim(line.substr(equals + 1))));
    }
    setup.sections = std::move(sections);
    return setup;
}

std::map<std::string, long>& Counters() {
    static std::map<std::string, long> counters;
    return counters;
}

}  // namespace

bool EqualNoCase(const std::string& a, const std::string& b) {
    if (a.size() != b.size()) return false;
    for (std::size_t i = 0; i < a.size(); ++i)
        if (std::tolower(static_cast<unsigned char>(a[i])) != std::tolower(static_cast<unsigned char>(b[i])))
            return false;
    return true;
}

std::vector<std::string> SplitList(const std::string& text) {
    std::vector<std::string> items;
    std::size_t start = 0;
    while (start <= text.size()) {
        std::size_t comma = text.find(',', start);
        if (comma == std::string::npos) comma = text.size();
        std::string item = Trim(text.substr(start, comma - start));
        if (!item.empty()) items.push_back(item);
        start = comma + 1;
    }
    return items;
}

long ParseNumber(const std::string& text, long fallback) {
    std::string value = Trim(text);
    if (value.empty()) return fallback;
    char* end = nullptr;
    bool hex = value.size() > 2 && value[0] == '0' && (value[1] == 'x' || value[1] == 'X');
    long long number = hex ? static_cast<long long>(std::strtoull(value.c_str() + 2, &end, 16))
                           : std::strtoll(value.c_str(), &end, 10);
    if (!end || *end != '\0') return fallback;
    return static_cast<long>(static_cast<int>(number));
}

Setup Setup::Current() {
    static Stamp cachedStamp;
    static Setup cached;
    std::lock_guard<std::mutex> guard(StateLock());
    Stamp stamp = StampOf(SetupPath());
    if (!(stamp == cachedStamp)) {
        cached = stamp.exists ? Read(stamp.path) : Setup{};
        cached.path = stamp.path;
        cachedStamp = stamp;
    }
    return cached;
}

std::vector<std::string> Setup::Objects(const std::string& area) const {
    std::vector<std::string> objects;
    for (const Section& section : *sections) {
        if (section.name.size() <= area.size() || !EqualNoCase(section.name.substr(0, area.size()), area)) continue;
        if (section.name[area.size()] != ' ') continue;
        objects.push_back(Trim(section.name.substr(area.size() + 1)));
    }
    return objects;
}

const Section* Setup::Find(const std::string& area, const std::string& object) const {
    std::string name = object.empty() ? area : area + " " + object;
    for (const Section& section : *sections)
        if (EqualNoCase(section.name, name)) return &section;
    return nullptr;
}

std::string Setup::Get(const std::string& area, const std::string& object, const std::string& key,
                       const std::string& fallback) const {
    if (const Section* section = Find(area, object))
        for (const auto& [name, value] : section->entries)
            if (EqualNoCase(name, key)) return value;
    return fallback;
}

long Setup::GetLong(const std::string& area, const std::string& object, const std::string& key, long fallback) const {
    return ParseNumber(Get(area, object, key), fallback);
}

bool Setup::Has(const std::string& area, const std::string& object, const std::string& key) const {
    if (const Section* section = Find(area, object))
        for (const auto& entry : section->entries)
            if (EqualNoCase(entry.first, key)) return true;
    return false;
}

void Count(const std::string& name, long step) {
    std::lock_guard<std::mutex> guard(StateLock());
    Counters()[name] += step;
}

long Counter(const std::string& name) {
    std::lock_guard<std::mutex> guard(StateLock());
    auto found = Counters().find(name);
    return found == Counters().end() ? 0 : found->second;
}

void ResetCounters() {
    std::lock_guard<std::mutex> guard(StateLock());
    Counters().clear();
}

}  // namespace sim

// Every stand-in exports these, so a test in the same process reads the counts of the very
// instance the product loaded (GetModuleHandle + GetProcAddress).
extern "C" __declspec(dllexport) long SimCounter(const char* name) { return sim::Counter(name ? name : ""); }
extern "C" __declspec(dllexport) void SimResetCounters() { sim::ResetCounters(); }
