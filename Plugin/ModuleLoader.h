#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "SystemTool/DllLoader.h"
#include "SystemTool/IO/Directory.h"

namespace SystemTool {

/// Owns one plug-in library and the object of interface `T` that the library makes.
///
/// A plug-in exports two functions with C linkage: "CreateModule" returns a new object, and "DestoryModule"
/// destroys it. The second name is misspelled on purpose: every plug-in of the suite exports it so.
///
/// Life: constructed → loaded (GetModule gives the object) → unloaded (the object is destroyed; its pointer
/// stays as it was and must not be used any more). A load that failed can be tried again by calling Load.
///
/// Threads: Load and Unload from any thread. The lock does not cover the use of the object: the plug-in's
/// interface says which threads may use it.
///
/// Failure: the result of Load, and GetLastError. Nothing is logged here, because the logger itself is loaded
/// by this class.
template <typename T>
class ModuleLoader {
public:
    /// Loads the library at once. `path` is the full path of the file, and is used exactly as given. When the
    /// load fails, GetModule returns null: callers test that.
    explicit ModuleLoader(const std::string& path) : m_strModulePath(path) {
        ConfigureModuleName();
        m_pDllLoader = std::make_unique<DllLoader>();
        Load();
    }

    /// Calls Unload, once. When the library has no "DestoryModule", this ends the process: the object cannot
    /// be destroyed, and an exception cannot leave a destructor.
    ~ModuleLoader() {
        if (m_bReleased)
            return;
        m_bReleased = true;
        Unload();
        m_pDllLoader.reset();
    }

    ModuleLoader(const ModuleLoader&) = delete;
    ModuleLoader& operator=(const ModuleLoader&) = delete;

    /// Sets the module's name to the file-name part of the path. A path without a directory gives an empty
    /// name. That is deliberate: callers use the name only to distinguish installed plug-ins, and those have
    /// full paths.
    void ConfigureModuleName() {
        if (m_strModulePath.empty()) {
            m_strModuleName.clear();
            return;
        }
        std::string path;
        if (!IO::Directory::TransformAsUnixPath(m_strModulePath, path))
            return;
        const auto separator = path.rfind('/');
        m_strModuleName = separator == std::string::npos ? std::string() : path.substr(separator + 1);
    }

    /// Opens the library and calls its "CreateModule". True when that succeeded now or before. A library
    /// without "CreateModule" stays open, so the next call returns true although there is no object.
    bool Load() {
        const std::lock_guard lock(m_mutex);
        if (m_strModulePath.empty())
            return false;
        if (!m_pDllLoader)
            return Fail("Dll loader is null when loading:" + m_strModulePath);
        if (m_pDllLoader->IsLoad())
            return true;
        if (!m_pDllLoader->Load(m_strModulePath))
            return Fail(m_pDllLoader->GetLastError());
        if (!m_pDllLoader->IsHasFunc("CreateModule"))
            return Fail("No CreateModule func export,please check your dll export regular:" +
                        m_strModulePath);
        m_pModule = Create();
        return true;
    }

    /// Destroys the object and closes the library; true also when no library was open. Throws
    /// boost::system::system_error when the library has no "DestoryModule".
    bool Unload() {
        if (!m_pDllLoader)
            return false;
        const std::lock_guard lock(m_mutex);
        if (!m_pDllLoader->IsLoad())
            return true;
        m_pDllLoader->template get<void(T*)>("DestoryModule")(m_pModule);
        m_pDllLoader->Unload();
        return true;
    }

    /// The plug-in's object, owned by the plug-in; null until a load succeeded.
    T* GetModule() const { return m_pModule; }

    /// Why the last failed Load failed; empty before a failure.
    const std::string& GetLastError() const { return m_strLastError; }

    /// The file-name part of the path.
    const std::string& GetModuleName() const { return m_strModuleName; }

private:
    /// When "CreateModule" throws, the plug-in stays open until the process ends: the exception may be of a
    /// class of the plug-in, whose code must stay loaded for as long as the exception exists.
    T* Create() {
        try {
            return m_pDllLoader->template get<T*()>("CreateModule")();
        } catch (...) {
            static auto* const keptOpen = new std::vector<std::unique_ptr<DllLoader>>;
            keptOpen->push_back(std::move(m_pDllLoader));
            throw;
        }
    }

    bool Fail(std::string text) {
        m_strLastError = std::move(text);
        return false;
    }

    std::mutex m_mutex; ///< Held for the whole of Load and of Unload.
    std::string m_strModuleName;
    std::string m_strModulePath;
    std::unique_ptr<DllLoader> m_pDllLoader;
    T* m_pModule = nullptr;
    std::string m_strLastError;
    bool m_bReleased = false;
};

} // namespace SystemTool
