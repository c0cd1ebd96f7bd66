// Off Windows there is no registry, no shell and no host product: every lookup finds nothing. The
// native build keeps the directory rules for their tests, which bring their own DirectorySystem.
#include "DirectoryGetter.h"
#include "ErrorCodes.h"
#include "TEException.h"

namespace sm {
namespace {

class PortableDirectorySystem final : public DirectorySystem {
public:
    std::optional<std::string> LoadedFrameworkModulePath() override { return std::nullopt; }
    std::optional<std::string> ClassesRootDefaultValue(std::string_view) override { return std::nullopt; }
    std::optional<std::string> MachineValue(std::string_view, std::string_view, bool) override { return std::nullopt; }
    std::string ShellFolder(int) override { TE_RAISE(TE_PATH_NOT_FOUND, "DirectoryGetter::GetShellFolder"); }
    bool FileExists(std::string_view path) override { return Path(path).Exists(); }
};

}  // namespace

DirectorySystem& GetDefaultDirectorySystem() {
    static PortableDirectorySystem system;
    return system;
}

}  // namespace sm
