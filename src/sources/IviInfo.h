// IVI logical names and virtual instruments from the machine's IVI configuration store, read
// through the configuration library "iviconfig.dll" in the system directory. Each virtual
// instrument gives one entry per IVI class of its driver; the init defaults come from the session
// manager's configuration file. The entries are read again whenever the store or the file changed.
#pragma once

#include <cstdint>
#include <string_view>

#include "com/DriverLibrary.h"
#include "sources/InfoBase.h"
#include "sources/IviConfigFunctions.h"
#include "sources/IviEntry.h"

namespace sm {

class IviInfo : public InfoBase {
public:
    IviInfo() = default;
    IviInfo(const IviInfo&) = delete;
    IviInfo& operator=(const IviInfo&) = delete;
    ~IviInfo() override;

    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    void ListCategories(std::string_view subCategory, StringVector& categories) override;

    // The current entries, read again when the store or the configuration file changed.
    const IviEntryList& GetEntries(std::int32_t* generation = nullptr);
    // GetEntries, then the first entry that answers to name, copied out.
    bool FindEntry(std::string_view name, IviEntry& found);
    void AppendStateDescription(String& text);

private:
    using Handle = void*;
    using Status = std::int32_t;
    using Functions = IviConfigFunctions;

    void LoadFunctionPointers();
    void UnloadLibrary();
    Handle GetIviIniHandle(std::int32_t* generation);
    void ReadEntries(Handle handle, IviEntryList& target);
    void ApplyFileSettings(IviEntryList& target);
    const StringVector& GetClasses();

    IviEntryList entries;
    std::int32_t entriesGeneration = 0;
    StringVector classes;
    std::int32_t classesGeneration = 0;
    DriverLibrary library;
    Functions functions;
};

}  // namespace sm
