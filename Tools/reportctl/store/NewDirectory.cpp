#include "Tools/reportctl/store/NewDirectory.h"

#include <filesystem>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"

namespace reportctl::store {

NewDirectory::NewDirectory(std::string path) : m_path(std::move(path)) {
    if (::mkdir(m_path.c_str(), 0700) != 0)
        SystemTool::ThrowErrno("cannot make the directory " + m_path);
}

NewDirectory::~NewDirectory() {
    std::error_code ignored;
    if (!m_isKept)
        std::filesystem::remove_all(m_path, ignored);
}

void NewDirectory::Keep() {
    const SystemTool::IO::Descriptor directory(::open(m_path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!directory.IsOpen() || ::syncfs(directory.Number()) != 0)
        SystemTool::ThrowErrno("cannot write " + m_path);
    m_isKept = true;
}

} // namespace reportctl::store
