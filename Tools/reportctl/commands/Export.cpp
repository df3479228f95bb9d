
#include <algorithm>
#include <limits>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/FilterOptions.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/RowText.h"
#include "Tools/reportctl/store/Rows.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Progress.h"
#include "Tools/reportctl/terminal/Result.h"

namespace reportctl::commands {
namespace {

using store::ReportRow;

constexpr auto HELP =
    "Examples:\n"
    "  reportctl export --format csv --since 2026-11-20 --until 2026-11-21 --output yesterday.csv\n"
    "  reportctl export --format jsonl --event 'B100|' | gzip > b100.jsonl.gz\n"
    "  reportctl export --format jsonl --after-id 4711        # what came after the row 4711\n"
    "\n"
    "The columns: id, at (UTC; empty when createTime is no number or no date), event, module and action "
    "(before and\n"
    "after the event's first bar), value, openid, suite_version, create_time (as it is stored). The rows "
    "come in the\n"
    "order of their ids. A spreadsheet may take a value that begins with = for a formula: import it as "
    "text.\n"
    "\n";

constexpr auto COLUMNS =
    "id, at, event, module, action, value, value_json is not null, openid, suite_version, "
    "create_time";

struct ExportOptions {
    std::string format = "csv";
    FilterOptions filter;
    std::int64_t afterId = std::numeric_limits<std::int64_t>::min();
    std::string output;
};

ReportRow::Text TextOf(const SQLite::Column& column) {
    if (column.isNull())
        return std::nullopt;
    const auto* bytes = column.getText(); // must come before getBytes: it turns a number into a text
    return std::string_view(bytes, static_cast<std::size_t>(column.getBytes()));
}

ReportRow RowOf(SQLite::Statement& row) {
    return {.id = row.getColumn(0).getInt64(),
            .at = TextOf(row.getColumn(1)),
            .event = TextOf(row.getColumn(2)),
            .module = TextOf(row.getColumn(3)),
            .action = TextOf(row.getColumn(4)),
            .value = TextOf(row.getColumn(5)),
            .isJson = row.getColumn(6).getInt() != 0,
            .openid = TextOf(row.getColumn(7)),
            .suiteVersion = TextOf(row.getColumn(8)),
            .createTime = TextOf(row.getColumn(9))};
}

/// Writes the rows and returns their number.
std::int64_t WriteRows(const ExportOptions& options, terminal::Result& output) {
    auto database = store::OpenToRead(store::StorePath());
    auto ids = store::AllIds(database);
    if (options.afterId >= ids.first)
        ids.first = std::min(options.afterId, ids.end - 1) + 1;
    auto rows = store::SelectReports(database, COLUMNS, options.filter.Read(), "order by id");
    const bool isCsv = options.format == "csv";
    if (isCsv)
        output.Write(store::CSV_HEADER);
    terminal::Progress progress("exporting");
    std::int64_t count = 0;
    std::string lines;
    store::InPieces(ids, store::IDS_AT_ONCE, [&](store::IdRange piece) {
        lines.clear();
        for (store::BindPiece(rows, piece); rows.executeStep(); ++count)
            (isCsv ? store::AppendCsv : store::AppendJsonLine)(lines, RowOf(rows));
        rows.reset(); // ends the read, so that none is open while Write waits for a slow pipe
        output.Write(lines);
        progress.Show(piece.end - ids.first, ids.end - ids.first);
    });
    output.Finish();
    return count;
}

int RunExport(const ExportOptions& options) {
    terminal::Result output(options.output);
    const auto count = store::Naming(store::StorePath(), [&] { return WriteRows(options, output); });
    if (!output.IsStandardOutput())
        fmt::print(stderr, "{} rows written to {}\n", count, options.output);
    return 0;
}

} // namespace

void AddExport(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<ExportOptions>();
    auto* command = app.add_subcommand(
        "export", "Write the store's rows as CSV or JSON Lines, while the service goes on.");
    command->add_option("--format", options->format, "csv (RFC 4180) or jsonl (one JSON object a line)")
        ->check(CLI::IsMember({"csv", "jsonl"}))
        ->capture_default_str();
    options->filter.AddTo(*command);
    command->add_option("--after-id", options->afterId, "Only rows with a greater id: go on where you were");
    command->add_option("--output", options->output,
                        "The file to write, whole or not at all, mode 0600; without it, standard output");
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunExport(*options); });
}

} // namespace reportctl::commands
