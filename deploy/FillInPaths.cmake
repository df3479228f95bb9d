# Writes OUTPUT from INPUT, with @reportctl@ replaced by the path of the installed reportctl. Runs at
# installation, because only then the prefix is certain. DESTDIR is not part of the path: it is where a
# package is put together, not where it is installed. FORM says what the file is:
#   unit   systemd's: "%" stands for something else there, and a path with a blank needs quotes
#   plist  an XML text
cmake_minimum_required(VERSION 3.25)

# A relative PREFIX belongs to the current folder; an absolute BINDIR is not below the prefix.
cmake_path(ABSOLUTE_PATH PREFIX NORMALIZE)
cmake_path(ABSOLUTE_PATH BINDIR BASE_DIRECTORY "${PREFIX}" NORMALIZE OUTPUT_VARIABLE reportctl)
cmake_path(APPEND reportctl reportctl)

if(FORM STREQUAL "unit")
    string(REPLACE "%" "%%" reportctl "${reportctl}")
    if(NOT reportctl MATCHES "^[A-Za-z0-9/._+%@:,=-]*$")
        string(REPLACE "\\" "\\\\" reportctl "${reportctl}")
        string(REPLACE "\"" "\\\"" reportctl "${reportctl}")
        set(reportctl "\"${reportctl}\"")
    endif()
else()
    string(REPLACE "&" "&amp;" reportctl "${reportctl}")
    string(REPLACE "<" "&lt;" reportctl "${reportctl}")
endif()

configure_file("${INPUT}" "${OUTPUT}" @ONLY)
