#include <algorithm>

#include <fmt/format.h>

#include "Tools/reportctl/status/Figures.h"
#include "Tools/reportctl/status/Status.h"

namespace reportctl::status {
namespace {

std::string NameOf(const Figure& figure) {
    auto name = "hublink_report_" + figure.name + (figure.isCounter ? "_total" : "");
    std::replace(name.begin(), name.end(), '.', '_');
    return name;
}

std::string ValueOf(const Figure::Sample& sample) {
    if (const auto* integer = std::get_if<std::int64_t>(&sample.value))
        return fmt::format("{}", *integer);
    return fmt::format("{:.3f}", std::get<double>(sample.value));
}

std::string TextOf(const Figure& figure) {
    const auto name = NameOf(figure);
    auto text = fmt::format("# HELP {0} {1}\n# TYPE {0} {2}\n", name, figure.help,
                            figure.isCounter ? "counter" : "gauge");
    for (const auto& sample : figure.samples)
        text += name + (sample.reason.empty() ? "" : fmt::format("{{reason=\"{}\"}}", sample.reason)) + ' ' +
                ValueOf(sample) + '\n';
    return text;
}

} // namespace

std::string MetricsOf(const Status& status, const Judgement& judgement) {
    std::string text;
    for (const auto& figure : FiguresOf(status, judgement))
        text += TextOf(figure);
    return text;
}

} // namespace reportctl::status
