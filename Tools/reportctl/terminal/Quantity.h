#pragma once

#include <cstdint>
#include <string>

/// Numbers as a person reads them.
namespace reportctl::terminal {

/// Such as "9999 B", "16.4 KB", "127.8 MB". A KB has 1000 bytes.
std::string Bytes(std::uint64_t bytes);

/// With commas, such as "1,234,567".
std::string Number(std::uint64_t number);

/// With the thing that is counted, such as "1 error" and "1,234 errors".
std::string Counted(std::uint64_t number, const std::string& thing);

/// Such as "90 s", "100 min", "30 h" and "3 days".
std::string Duration(std::int64_t milliseconds);

} // namespace reportctl::terminal
