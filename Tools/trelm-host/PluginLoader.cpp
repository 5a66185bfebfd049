#include "PluginLoader.h"

#include <dlfcn.h>

#include <exception>
#include <filesystem>
#include <system_error>

namespace trelm {
namespace host {

namespace {

// dlerror() text, or a fallback when the loader gave none.
std::string lastDlError() {
    char const* text = dlerror();
    return text != nullptr ? text : "unknown reason";
}

}  // namespace

PluginLoader::~PluginLoader() {
    table_.clear();
    for (auto it = handles_.rbegin(); it != handles_.rend(); ++it) dlclose(*it);
}

uError PluginLoader::load(std::string const& path) {
    dlerror();  // drop a stale message so the one reported belongs to this call
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr) {
        return TRELM_ERROR_MSG(kNotFound, "cannot load plug-in " + path + ": " + lastDlError());
    }
    dlerror();
    void* symbol = dlsym(handle, "getComponents");
    if (symbol == nullptr) {
        std::string reason = lastDlError();
        dlclose(handle);
        return TRELM_ERROR_MSG(kNotFound,
                               "plug-in " + path + " has no entry point getComponents: " + reason);
    }
    auto getComponents = reinterpret_cast<GetComponents>(symbol);

    // Each plug-in fills a table of its own, so that what it offered can be reported even when
    // it replaces an identifier that an earlier plug-in brought.
    Table offered;
    uError called;
    try {
        called = getComponents(offered);
    } catch (std::exception const& e) {
        called = TRELM_ERROR_MSG(kFailure, String("exception: ") + e.what());
    }
    if (called.failed()) {
        // The plug-in's error may point into the module (its stamped file names), and a module
        // that ran code may have left itself registered elsewhere: it stays open.
        handles_.push_back(handle);
        return TRELM_WRAP_MSG(kFailure, called, "getComponents of plug-in " + path + " failed");
    }

    Plugin plugin{path, {}};
    for (auto const& [id, factory] : offered) {
        uError e = table_.insert(id, factory);
        if (e.ok()) e = plugin.ids.pushBack(id);
        if (e.failed()) {
            // Entries already merged point into this module: it must stay open.
            handles_.push_back(handle);
            return TRELM_WRAP_MSG(kFailure, e, "cannot record the components of " + path);
        }
    }
    handles_.push_back(handle);
    plugins_.push_back(std::move(plugin));
    return TRELM_OK();
}

std::string PluginLoader::defaultPluginPath() {
    std::error_code ec;
    std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe", ec);
    if (ec) return "libtrelmfacebook.so";  // left to the dynamic loader's search path
    std::filesystem::path bin = program.parent_path();
    std::filesystem::path installed =
        (bin / TRELM_HOST_PLUGIN_DIR / "libtrelmfacebook.so").lexically_normal();
    if (std::filesystem::exists(installed, ec)) return installed.string();
    return (bin.parent_path() / "lib" / "libtrelmfacebook.so").string();
}

}  // namespace host
}  // namespace trelm
