#include "Tools/reportctl/bundle/Archive.h"

#include <cerrno>
#include <ctime>
#include <stdexcept>

#include <archive.h>
#include <archive_entry.h>

namespace reportctl::bundle {
namespace {

/// Writes the archive's bytes into the file. It catches every exception: none may pass through the library,
/// which is written in C.
la_ssize_t Write(struct archive* archive, void* file, const void* bytes, std::size_t size) {
    try {
        static_cast<terminal::Result*>(file)->Write({static_cast<const char*>(bytes), size});
        return static_cast<la_ssize_t>(size);
    } catch (const std::exception& error) {
        ::archive_set_error(archive, EIO, "%s", error.what());
        return -1;
    }
}

} // namespace

Archive::Archive(const std::string& path)
    : m_file(path), m_archive(::archive_write_new(), &::archive_write_free) {
    Check(::archive_write_add_filter_gzip(m_archive.get()));
    Check(::archive_write_set_format_pax_restricted(m_archive.get()));
    Check(::archive_write_set_bytes_in_last_block(m_archive.get(),
                                                  1)); // no padding: only a tape needs whole blocks
    Check(::archive_write_open(m_archive.get(), &m_file, nullptr, &Write, nullptr));
}

void Archive::Check(int code) const {
    if (code != ARCHIVE_OK)
        throw std::runtime_error(::archive_error_string(m_archive.get()));
}

void Archive::Add(const std::string& name, const std::string& content) {
    const std::unique_ptr<struct archive_entry, void (*)(struct archive_entry*)> entry(::archive_entry_new(),
                                                                                       &::archive_entry_free);
    ::archive_entry_set_pathname(entry.get(), name.c_str());
    ::archive_entry_set_size(entry.get(), static_cast<la_int64_t>(content.size()));
    ::archive_entry_set_filetype(entry.get(), AE_IFREG);
    ::archive_entry_set_perm(entry.get(), 0600);
    ::archive_entry_set_mtime(entry.get(), std::time(nullptr), 0);
    Check(::archive_write_header(m_archive.get(), entry.get()));
    if (::archive_write_data(m_archive.get(), content.data(), content.size()) < 0)
        throw std::runtime_error(::archive_error_string(m_archive.get()));
}

void Archive::Finish() {
    Check(::archive_write_close(m_archive.get()));
    m_file.Finish();
}

} // namespace reportctl::bundle
