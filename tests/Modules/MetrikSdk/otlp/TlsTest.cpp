#include <cstdlib>

#include <Poco/Net/Context.h>
#include <Poco/Net/NetException.h>
#include <Poco/Net/SSLManager.h>
#include <Poco/Net/SecureServerSocket.h>

#include "Modules/MetrikSdk/otlp/HttpSender.h"
#include "tests/Modules/MetrikSdk/support/PluginFixture.h"
#include "tests/Modules/MetrikSdk/support/SmallDisk.h"

using namespace std::chrono_literals;

namespace {

/// Makes a key and a self-signed certificate, as <name>.key and <name>.crt.
void MakeCertificate(const std::string& name, const std::string& host) {
    // Two certificates of the same name could be confused.
    const auto command = "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -days 2 "
                         "-keyout '" +
                         name + ".key' -out '" + name +
                         ".crt' -subj /CN=" + name.substr(name.rfind('/') + 1) +
                         " -addext subjectAltName=" + host + " 2>/dev/null";
    ASSERT_EQ(std::system(command.c_str()), 0) << "openssl(1) is needed";
}

class TheTls : public PluginFixture {
protected:
    void StartAgainst(const std::string& host, Poco::Net::Context::VerificationMode mode) {
        MakeCertificate(m_keys.Path() + "/server", host);
        MakeCertificate(m_keys.Path() + "/client", "IP:127.0.0.1");
        Serve(mode);
        Start();
    }

    void Serve(Poco::Net::Context::VerificationMode mode) {
        const auto server = m_keys.Path() + "/server";
        Poco::Net::Context::Params parameters;
        parameters.privateKeyFile = server + ".key";
        parameters.certificateFile = server + ".crt";
        parameters.caLocation = m_keys.Path() + "/client.crt";
        parameters.verificationMode = mode;
        Poco::Net::Context::Ptr context =
            new Poco::Net::Context(Poco::Net::Context::TLS_SERVER_USE, parameters);
        m_server = std::make_unique<LoopbackServer>(
            [](const Request&) { return Reply(); },
            Poco::Net::SecureServerSocket(Poco::Net::SocketAddress("127.0.0.1", 0), 64, context));
        Configure("ENDPOINT", m_server->Url("https"));
    }

    void ExpectNothingLeaves() {
        Report(10);
        EXPECT_TRUE(WaitUntil([] { return Told::Failures().Count("upload: ") == 1; }));
        Stop();
        EXPECT_EQ(Totals().waiting, 10);
        EXPECT_EQ(m_server->RequestCount(), 0U);
    }

    TemporaryDirectory m_keys;
    std::unique_ptr<LoopbackServer> m_server;
};

TEST_F(TheTls, DeliversToACollectorWhoseCertificateWasNamed) {
    Configure("CERTIFICATE", m_keys.Path() + "/server.crt");
    StartAgainst("IP:127.0.0.1", Poco::Net::Context::VERIFY_NONE);
    Report(10);
    EXPECT_TRUE(WaitUntilNothingWaits());
    EXPECT_EQ(Totals().delivered, 10);
}

TEST_F(TheTls, TrustsTheNamedCertificateInsteadOfTheSystemsDirectory) {
#if defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizer wants no threads in a child that was forked";
#endif
    const std::string system = "/etc/ssl/certs";
    const auto result = RunOnSmallDisk(system, 1'000'000, [&] {
        const auto keys = m_keys.Path();
        MakeCertificate(keys + "/server", "IP:127.0.0.1");
        MakeCertificate(keys + "/client", "IP:127.0.0.1");
        const auto install = "cp '" + keys + "/client.crt' " + system + "/ca-certificates.crt && cp '" +
                             keys + "/server.crt' " + system + "/$(openssl x509 -hash -noout -in '" + keys +
                             "/server.crt').0";
        ASSERT_EQ(std::system(install.c_str()), 0);
        Serve(Poco::Net::Context::VERIFY_NONE);
        Start();
        Report(1);
        EXPECT_TRUE(WaitUntilNothingWaits()) << "the system's directory vouches for the collector";
        Stop();
        Configure("CERTIFICATE", keys + "/client.crt");
        Start();
        Report(10);
        EXPECT_TRUE(WaitUntil([] { return Told::Failures().Count("upload: ") == 1; }));
        Stop();
        EXPECT_EQ(Totals().waiting, 10) << "the named certificate does not";
        m_server.reset();
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "no right to mount a file system here";
    EXPECT_EQ(result, SmallDiskResult::Passed);
}

TEST(HttpSender, TellsAnOptionThatTheLibraryRefuses) {
    MetrikSdk::otlp::EndpointConfig config;
    config.url = "https://127.0.0.1:1/";
    EXPECT_NO_THROW(MetrikSdk::otlp::HttpSender{config});
    config.certificate = std::string(9'000'000, 'x'); // longer than any text that the library accepts
    EXPECT_THROW(MetrikSdk::otlp::HttpSender{config}, std::runtime_error);
}

TEST_F(TheTls, DeliversNothingToACollectorThatNobodyVouchesFor) {
    StartAgainst("IP:127.0.0.1", Poco::Net::Context::VERIFY_NONE);
    ExpectNothingLeaves();
}

TEST_F(TheTls, DeliversNothingToACollectorWithAnotherHostsCertificate) {
    Configure("CERTIFICATE", m_keys.Path() + "/server.crt");
    StartAgainst("DNS:elsewhere.example", Poco::Net::Context::VERIFY_NONE);
    ExpectNothingLeaves();
}

TEST_F(TheTls, IdentifiesItselfToACollectorThatAsks) {
    Configure("CERTIFICATE", m_keys.Path() + "/server.crt");
    Configure("CLIENT_KEY", m_keys.Path() + "/client.key");
    Configure("CLIENT_CERTIFICATE", m_keys.Path() + "/client.crt");
    StartAgainst("IP:127.0.0.1", Poco::Net::Context::VERIFY_STRICT);
    Report(10);
    EXPECT_TRUE(WaitUntilNothingWaits());
    EXPECT_EQ(Totals().delivered, 10);
}

TEST_F(TheTls, DeliversNothingWhereItCannotIdentifyItself) {
    Configure("CERTIFICATE", m_keys.Path() + "/server.crt");
    StartAgainst("IP:127.0.0.1", Poco::Net::Context::VERIFY_STRICT);
    ExpectNothingLeaves();
}

} // namespace
