// The time of one record through the real plug-in. To compare: the bare system call, which is needed in any
// case, and the file backend of Boost.Log.

#include <cstdlib>
#include <filesystem>
#include <string>

#include <fcntl.h>
#include <unistd.h>

#include <benchmark/benchmark.h>
#include <boost/log/core.hpp>
#include <boost/log/expressions.hpp>
#include <boost/log/sinks/sync_frontend.hpp>
#include <boost/log/sinks/text_file_backend.hpp>
#include <boost/log/sources/logger.hpp>
#include <boost/log/sources/record_ostream.hpp>
#include <boost/log/support/date_time.hpp>
#include <boost/log/utility/setup/common_attributes.hpp>
#include <boost/make_shared.hpp>

#include "Plugin/ILogger.h"
#include "Plugin/ModuleLoader.h"

namespace {

namespace logging = boost::log;

/// A report as the service logs it: 180 bytes.
const std::string MESSAGE = R"({"eventID":"A759|10001","value":{"button":"open","page":"settings",)"
                            R"("duration":1532,"items":[1,2,3,4,5,6],"user":"visitor"},)"
                            R"("createTime":1700000000,"isDayReport":0,"pType":0,"n":1})";

/// The same record as the plug-in writes it, to compare with the bare write.
const std::string LINE =
    "2026-11-20 10:15:30.123 INFO  [12345:12346] [App/ReportServer:42 Recv] " + MESSAGE + "\n";

/// A log directory, which is removed when the program ends. It is on the disk of the working directory,
/// because a real log is not kept in memory.
class LogFolder {
public:
    LogFolder() {
        std::string name = std::filesystem::current_path().string() + "/boost_logger_bench.XXXXXX";
        m_path = mkdtemp(name.data());
    }
    ~LogFolder() { std::filesystem::remove_all(m_path); }
    const std::string& Path() const { return m_path; }

private:
    std::string m_path;
};

LogFolder& Folder() {
    static LogFolder folder;
    return folder;
}

void BareWrite(benchmark::State& state) {
    static const int file = open((Folder().Path() + "/bare.log").c_str(),
                                 O_WRONLY | O_APPEND | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    for (auto _ : state)
        benchmark::DoNotOptimize(write(file, LINE.data(), LINE.size()));
    state.SetItemsProcessed(state.iterations());
    if (state.thread_index() == 0 && ftruncate(file, 0) != 0)
        state.SkipWithError("cannot empty the file");
}

void TextFileBackendWithAutoFlush(benchmark::State& state) {
    namespace keywords = logging::keywords;
    namespace expr = logging::expressions;
    const auto backend = boost::make_shared<logging::sinks::text_file_backend>(
        keywords::file_name = Folder().Path() + "/backend.log",
        keywords::target_file_name = Folder().Path() + "/backend_%N.log",
        keywords::rotation_size = 10 * 1024 * 1024, keywords::auto_flush = true);
    const auto sink =
        boost::make_shared<logging::sinks::synchronous_sink<logging::sinks::text_file_backend>>(backend);
    sink->set_formatter(
        expr::stream << expr::format_date_time<boost::posix_time::ptime>("TimeStamp", "%Y-%m-%d %H:%M:%S.%f")
                     << " INFO  [" << expr::attr<logging::process_id>("ProcessID") << ":"
                     << expr::attr<logging::thread_id>("ThreadID") << "] " << expr::smessage);
    logging::add_common_attributes();
    logging::core::get()->add_sink(sink);
    logging::sources::logger logger;
    for (auto _ : state)
        BOOST_LOG(logger) << MESSAGE;
    state.SetItemsProcessed(state.iterations());
    logging::core::get()->remove_sink(sink);
    logging::core::get()->set_global_attributes({}); // the plug-in's records do not have these attributes
}

SystemTool::IO::ILogger* ConfiguredLogger() {
    static SystemTool::ModuleLoader<SystemTool::IO::ILogger> loader(
        SystemTool::IO::Directory::GetExcutableDirectory() + "libBoostLogger.dylib");
    if (loader.GetModule() != nullptr)
        loader.GetModule()->InitLog(Folder().Path(), "Report.log", "BENCH", "APP", 10 * 1024 * 1024,
                                    100 * 1024 * 1024, 1, 0);
    return loader.GetModule();
}

void PluginRecord(benchmark::State& state, const std::string& message) {
    static SystemTool::IO::ILogger* const logger = ConfiguredLogger();
    if (logger == nullptr)
        return state.SkipWithError("libBoostLogger.dylib is not beside this program");
    const std::string tag;
    const std::string file = "App/ReportServer";
    const std::string function = "Recv";
    for (auto _ : state)
        logger->WriteLog(2, tag, file, function, 42, message, 0);
    state.SetItemsProcessed(state.iterations());
}

void PluginReport(benchmark::State& state) {
    PluginRecord(state, MESSAGE);
}

/// A text in which no character takes the fast way through the escaping.
void PluginChineseText(benchmark::State& state) {
    std::string text;
    while (text.size() < MESSAGE.size())
        text += "报告";
    PluginRecord(state, text);
}

// The order matters: once the plug-in's sink is in the core, it stays there.
BENCHMARK(BareWrite)->UseRealTime();
BENCHMARK(TextFileBackendWithAutoFlush)->UseRealTime();
BENCHMARK(PluginReport)->UseRealTime();
BENCHMARK(PluginReport)->Threads(2)->UseRealTime();
BENCHMARK(BareWrite)->Threads(2)->UseRealTime();
BENCHMARK(PluginChineseText)->UseRealTime();

} // namespace
