#include "StateDirectory.h"

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace trelm {
namespace host {

namespace {

std::string homeFolder() {
    if (char const* home = std::getenv("HOME"); home != nullptr && home[0] != '\0') return home;
    if (passwd const* pw = getpwuid(getuid()); pw != nullptr && pw->pw_dir != nullptr) {
        return pw->pw_dir;
    }
    return ".";
}

}  // namespace

uError StateDirectory::prepare(std::string const& requested, std::string& path) {
    namespace fs = std::filesystem;
    fs::path folder = requested.empty() ? fs::path(homeFolder()) / ".trelm-host" : fs::path(requested);
    std::error_code ec;
    if (fs::exists(folder, ec)) {
        if (!fs::is_directory(folder, ec)) {
            return TRELM_ERROR_MSG(kFailure, "state folder " + folder.string() +
                                                 " is not a folder; choose another with --state-dir");
        }
    } else {
        if (folder.has_parent_path()) fs::create_directories(folder.parent_path(), ec);
        // The folder holds session secrets: only its owner may look inside, from the moment it
        // exists (mkdir's mode can only be narrowed by the umask; chmod undoes a narrower one).
        if (!ec && ::mkdir(folder.c_str(), 0700) != 0) ec = std::error_code(errno, std::generic_category());
        if (!ec) fs::permissions(folder, fs::perms::owner_all, fs::perm_options::replace, ec);
        if (ec) {
            return TRELM_ERROR_MSG(kFailure,
                                   "cannot create state folder " + folder.string() + ": " + ec.message() +
                                       "; choose another with --state-dir");
        }
    }
    // A folder that cannot take a new file would fail later, on the first store, with a less
    // telling message (and root passes every permission test but an immutable flag or a
    // read-only mount): a file is made and removed to know.
    std::string probe = (folder / ".write-test-XXXXXX").string();
    int const fd = ::mkstemp(probe.data());
    if (fd < 0) {
        std::string const why = std::error_code(errno, std::generic_category()).message();
        return TRELM_ERROR_MSG(kFailure, "state folder " + folder.string() + " cannot be written (" + why +
                                             "); make it writable or choose another with --state-dir");
    }
    ::close(fd);
    ::unlink(probe.c_str());
    path = folder.string();
    return TRELM_OK();
}

std::string StateDirectory::runtimeStorePath(std::string const& folder) {
    return (std::filesystem::path(folder) / "runtime-configuration.db").string();
}

std::string StateDirectory::itemStorePath(std::string const& folder) {
    return (std::filesystem::path(folder) / "items.db").string();
}

}  // namespace host
}  // namespace trelm
