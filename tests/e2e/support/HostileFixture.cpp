#include "tests/e2e/support/HostileFixture.h"

#include <algorithm>
#include <fstream>

#include <Poco/RegularExpression.h>
#include <gmock/gmock.h>

#include "tests/support/ProcessStatus.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAreArray;

namespace {

using namespace std::chrono_literals;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr auto STORED_WITHIN = 60s;
constexpr bool HAS_ITS_OWN_MEMORY = false; // most of the memory belongs to the sanitizer
#else
constexpr auto STORED_WITHIN = 1s;
constexpr bool HAS_ITS_OWN_MEMORY = true;
#endif

constexpr std::size_t MEMORY_BYTES = 100'000'000;

/// How many bytes may be in the socket at once: a quarter of the smallest buffer that a kernel grants by
/// default.
constexpr std::size_t UNREAD_BYTES = 50'000;
constexpr std::size_t BYTES_AROUND_A_DATAGRAM = 1000; // the kernel counts them, too

const std::string SCHEMA = "select type, name, tbl_name, sql from sqlite_master order by name";

/// The places in the code that a datagram may cause to write a line.
const Poco::RegularExpression
    SITE("^(App/ReportServer:(42 Recv|111 SetBaseInfo|123 JsonToStruct)|Frame/DBHelper:\\d+ ExecSql|"
         "Frame/FrameWorker:\\d+ Init|Metrik/MetrikMgr:(41 AddWorker|53 Update|(107|115) Send)|"
         "Metrik/MetrikWorker:((107|121) Send|21 FailCallBackFun))$");

/// Characters that would end a line or control a terminal. In this mode, a text that is not UTF-8 is also an
/// error.
const Poco::RegularExpression
    DANGEROUS("[\\x{0}-\\x{9}\\x{b}-\\x{1f}\\x{7f}-\\x{9f}\\x{2028}-\\x{202e}\\x{2066}-\\x{2069}]",
              Poco::RegularExpression::RE_UTF8);

std::size_t PeakMemoryOf(pid_t process) {
    return static_cast<std::size_t>(std::max(NumberInStatusOf(process, "VmHWM"), 0L)) * 1024;
}

std::vector<std::string> FilesBelow(const std::string& directory) {
    std::vector<std::string> files;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(directory))
        files.push_back(entry.path().string());
    return files;
}

} // namespace

HostileFixture::HostileFixture() : m_returnTo(std::filesystem::current_path()) {
    std::filesystem::current_path(m_workingDirectory.Path()); // the service inherits it
    m_service.Install();
    m_output = m_service.Output();
    m_service.Start();
    HaveABurstStored();
    m_before = WhatIsThere();
}

HostileFixture::~HostileFixture() {
    std::filesystem::current_path(m_returnTo);
}

/// Stores a burst of reports. After it, the service has started all the threads that it ever has.
void HostileFixture::HaveABurstStored() {
    constexpr int BURST = 20;
    for (int i = 0; i < BURST; ++i)
        Send(R"({"eventID":"Burst"})");
    m_service.AwaitQuiet();
    ++m_sent; // AwaitQuiet has sent a marker
    m_rowsBefore = m_service.RowCount();
    EXPECT_EQ(m_rowsBefore, BURST);
}

void HostileFixture::Send(const std::string& datagram) {
    m_unread += datagram.size() + BYTES_AROUND_A_DATAGRAM;
    if (m_unread > UNREAD_BYTES) {
        ASSERT_TRUE(WaitUntil([] { return Service::TookAllDatagrams(); }));
        m_unread = datagram.size() + BYTES_AROUND_A_DATAGRAM;
    }
    Service::Send(datagram);
    ++m_sent;
}

HostileFixture::Possessions HostileFixture::WhatIsThere() const {
    Possessions there;
    there.schema = m_service.Query(m_service.DatabaseFile(), SCHEMA);
    const auto outbox = m_service.Query(m_service.OutboxFile(), SCHEMA);
    there.schema.insert(there.schema.end(), outbox.begin(), outbox.end());
    there.baseInfo = m_service.Query(m_service.DatabaseFile(), "select * from BaseInfo");
    there.files = FilesBelow(m_service.DataDirectory());
    const std::string process = "/proc/" + std::to_string(m_service.Process());
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator(process + "/fd"))
        ++there.descriptors;
    for (const auto& entry : std::filesystem::directory_iterator(process + "/task"))
        there.threads.push_back(std::stoi(entry.path().filename()));
    return there;
}

void HostileFixture::ExpectSoundness(std::int64_t rows, std::int64_t events) {
    ExpectTheNextReportIsStored();
    ASSERT_TRUE(m_service.IsRunning());
    ExpectSoundDatabases(rows, events);
    ExpectOneLineForEachRecord();
    ExpectTrueLedger();
    ExpectNothingHasGrown();
}

void HostileFixture::ExpectTrueLedger() {
    const auto books = m_service.Books();
    EXPECT_TRUE(books.balanced);
    EXPECT_EQ(books.total[ReportLedger::RECEIVED], m_sent);
    EXPECT_EQ(ReportLedger::EndedIn(books.total), m_sent) << "the good one came last";
    EXPECT_EQ(m_service.Counted(ReportLedger::Outcome::Stored),
              static_cast<std::uint64_t>(m_service.RowCount()) + 1)
        << "with the marker, which was taken out";
    EXPECT_EQ(books.total[ReportLedger::LOST_AT_ENDS], 0U);
    EXPECT_EQ(books.total[ReportLedger::DROPPED_BY_KERNEL], 0U);
}

void HostileFixture::ExpectTheNextReportIsStored() {
    Send(R"({"eventID":"Good|1","value":{"a":1},"createTime":1700000000})");
    const auto stored = [this] {
        return m_service.Query(m_service.DatabaseFile(), "select value, createTime, pType from OperLog "
                                                         "where eventID = 'Good|1'") ==
               std::vector<std::string>{R"({"a":1}|1700000000000|0)"};
    };
    EXPECT_TRUE(WaitUntil(stored, STORED_WITHIN)) << m_service.RowCount() << " rows";
    EXPECT_TRUE(WaitUntil([this] { return ReportLedger::EndedIn(m_service.Books().total) == m_sent; }));
}

void HostileFixture::ExpectSoundDatabases(std::int64_t rows, std::int64_t events) {
    for (const auto& file : {m_service.DatabaseFile(), m_service.OutboxFile()})
        EXPECT_THAT(m_service.Query(file, "pragma integrity_check"), ElementsAre("ok")) << file;
    EXPECT_EQ(m_service.RowCount(), m_rowsBefore + rows + 1) << "with the good one";
    EXPECT_EQ(m_service.Count(m_service.OutboxFile(), "select count(*) from event"), events);
    const auto now = WhatIsThere();
    EXPECT_EQ(now.schema, m_before.schema);
    EXPECT_EQ(now.baseInfo, m_before.baseInfo);
}

void HostileFixture::ExpectOneLineForEachRecord() {
    EXPECT_EQ(Service::DroppedByKernel(), 0);
    EXPECT_TRUE(m_service.AwaitLines("App/ReportServer:42 Recv", m_sent));
    const auto threads = WhatIsThere().threads;
    for (const auto& line : m_service.LogLines()) { // LogLines throws for a line that is no record
        ASSERT_TRUE(SITE.match(line.site)) << line.site;
        ASSERT_EQ(line.process, m_service.Process());
        ASSERT_TRUE(std::find(threads.begin(), threads.end(), line.thread) != threads.end()) << line.thread;
    }
    std::ifstream log(m_service.LogFile(), std::ios::binary);
    for (std::string line; std::getline(log, line);)
        ASSERT_EQ(DANGEROUS.match(line, 0), false) << line;
}

void HostileFixture::ExpectNothingHasGrown() {
    const auto now = WhatIsThere();
    EXPECT_LE(now.descriptors, m_before.descriptors);
    EXPECT_THAT(now.threads, UnorderedElementsAreArray(m_before.threads));
    EXPECT_THAT(now.files, UnorderedElementsAreArray(m_before.files));
    EXPECT_THAT(FilesBelow(m_workingDirectory.Path()), IsEmpty());
    EXPECT_EQ(m_service.Output(), m_output) << "nothing is printed";
    const auto peak = PeakMemoryOf(m_service.Process());
    RecordProperty("peakMemoryBytes", std::to_string(peak));
    if (HAS_ITS_OWN_MEMORY) {
        EXPECT_LT(peak, MEMORY_BYTES);
        EXPECT_GT(peak, 0U);
    }
}
