#pragma once

#include <exception>
#include <string>

#include <boost/exception/exception.hpp>
#include <boost/exception/info.hpp>

namespace SystemTool {

/// The text that a BSException may carry beside its main one: `throw BSException("...") <<
/// BSErrorText("...")`.
using BSErrorText = boost::error_info<struct BSErrorTextTag, std::string>;

/// The exception that a plug-in may throw into the program. Its type is exported on purpose: otherwise a
/// handler in the program would not recognise what the plug-in threw.
class __attribute__((visibility("default"))) BSException : public std::exception, public boost::exception {
public:
    explicit BSException(std::string text) : m_text(std::move(text)) {}

    const char* what() const noexcept override { return m_text.c_str(); }

    /// One line for people, ended by a newline: the local time of this call in brackets, the main text after
    /// "[STL ERR] ", the attached text (empty when there is none) after " [BOOST ERR] ".
    std::string ErrorMsg() const;

private:
    std::string m_text;
};

} // namespace SystemTool
