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
/// A plug-in exports two functions with C linkage: "CreateModule" returns a new object, "DestoryModule" takes
/// it back. The second name is misspelled on purpose: every plug-in of the suite exports it so.
///
/// Life: constructed → loaded (GetModule gives the object) → unloaded (the object is gone, its pointer is not
/// cleared and must not be used any more). A failed load can be tried again by calling Load.
///
/// Threads: Load and Unload from any thread. Using the object is the plug-in's affair; nothing is locked
/// meanwhile.
///
/// Failure: never logged here, because the logger itself comes through a loader. Load's result and
/// GetLastError tell.
template <typename T>
class ModuleLoader {
public:
    /// Loads at once the library at `path`, the full path of the file, used exactly as given. Callers test
    /// GetModule.
    explicit ModuleLoader(const std::string& path) : m_strModulePath(path) {
        ConfigureModuleName();
        m_pDllLoader = std::make_unique<DllLoader>();
        Load();
    }

    /// Unloads, once. A library without "DestoryModule" ends the process here: its object cannot be given
    /// back, and an exception cannot leave a destructor.
    ~ModuleLoader() {
        if (m_bReleased)
            return;
        m_bReleased = true;
        Unload();
        m_pDllLoader.reset();
    }

    ModuleLoader(const ModuleLoader&) = delete;
    ModuleLoader& operator=(const ModuleLoader&) = delete;

    /// Sets the module's name to the file-name part of the path. A path without any directory gives an empty
    /// name; that is deliberate, callers use the name only to tell installed plug-ins apart, and those have
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

    /// Opens the library and has it make its object; true when that is done or was done before. A library
    /// that opened but lacks "CreateModule" stays open, so that the next call returns true without an object.
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

    /// Gives the object back and closes the library; true also when no library was open. Throws
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
    /// A plug-in that throws stays open for the rest of the process: its exception may be of a class of its
    /// own, whose code must be there for as long as the exception exists.
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
