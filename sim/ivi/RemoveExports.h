// Stand-in switch for "this library version lacks function X": the named exports of the calling
// module are blanked in its own export address table while it is being loaded, so GetProcAddress
// answers null for them exactly as for a library that never had them. One image serves every
// variant the setup file asks for.
#pragma once

#include <windows.h>

#include <string>
#include <vector>

namespace sim {

inline void RemoveExports(HMODULE module, const std::vector<std::string>& names) {
    if (names.empty()) return;
    auto* base = reinterpret_cast<BYTE*>(module);
    auto* dos = reinterpret_cast<IMAGE_DOS_HEADER*>(base);
    auto* nt = reinterpret_cast<IMAGE_NT_HEADERS*>(base + dos->e_lfanew);
    const IMAGE_DATA_DIRECTORY& directory = nt->OptionalHeader.DataDirectory[IMAGE_DIRECTORY_ENTRY_EXPORT];
    if (!directory.VirtualAddress) return;
    auto* exports = reinterpret_cast<IMAGE_EXPORT_DIRECTORY*>(base + directory.VirtualAddress);
    auto* functions = reinterpret_cast<DWORD*>(base + exports->AddressOfFunctions);
    auto* nameTable = reinterpret_cast<DWORD*>(base + exports->AddressOfNames);
    auto* ordinals = reinterpret_cast<WORD*>(base + exports->AddressOfNameOrdinals);
    for (DWORD index = 0; index < exports->NumberOfNames; ++index) {
        std::string exported(reinterpret_cast<const char*>(base + nameTable[index]));
        bool removed = false;
        for (const std::string& name : names) removed = removed || name == exported;
        if (!removed) continue;
        DWORD* slot = &functions[ordinals[index]];
        DWORD previous = 0;
        if (::VirtualProtect(slot, sizeof *slot, PAGE_READWRITE, &previous)) {
            *slot = 0;
            ::VirtualProtect(slot, sizeof *slot, previous, &previous);
        }
    }
}

}  // namespace sim
