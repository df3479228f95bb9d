#include "tests/support/ScriptedJson.h"

#include "SystemTool/IO/JsonDocument.h"

using SystemTool::IO::JsonDocument;

ScriptedJson g_scriptedJson;

// The linker redirects the core's calls of JsonDocument::FromJson to ScriptedFromJson below (its option
// --wrap). A member function gets its object as the first argument, so these functions have the document
// there.
#define FROM_JSON                                                                                            \
    "_ZN10SystemTool2IO12JsonDocument8FromJsonERKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEERS7_"

JsonDocument RealFromJson(JsonDocument* document, const std::string& text,
                          std::string& error) asm("__real_" FROM_JSON);
JsonDocument ScriptedFromJson(JsonDocument* document, const std::string& text,
                              std::string& error) asm("__wrap_" FROM_JSON);

JsonDocument ScriptedFromJson(JsonDocument* document, const std::string& text, std::string& error) {
    ThrowIf(g_scriptedJson.throws);
    JsonDocument result = RealFromJson(document, text, error);
    if (!g_scriptedJson.error.empty())
        error = g_scriptedJson.error;
    return result;
}
