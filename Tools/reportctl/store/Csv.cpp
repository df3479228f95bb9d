#include "Tools/reportctl/store/Csv.h"

namespace reportctl::store {

void AppendCsvField(std::string& out, std::optional<std::string_view> text) {
    if (!text)
        return;
    if (!text->empty() && text->find_first_of(",\"\r\n") == std::string_view::npos) {
        out += *text;
        return;
    }
    out += '"';
    for (const char c : *text)
        out.append(c == '"' ? 2 : 1, c);
    out += '"';
}

} // namespace reportctl::store
