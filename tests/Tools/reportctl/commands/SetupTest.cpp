#include <sys/stat.h>
#include <unistd.h>

#include "tests/Tools/reportctl/support/ReportctlFixture.h"
#include "tests/support/OtherUser.h"

namespace {

namespace fs = std::filesystem;

class Setup : public ReportctlFixture {
protected:
    void ExpectEverythingMade() const {
        EXPECT_EQ(ModeOf(Preferences()), 01777u);
        EXPECT_EQ(ModeOf(PidFile()), 0666u);
        EXPECT_EQ(OwnerOf(PidFile()), OwnerOf(Preferences()));
        for (const auto* directory : {"", "/database", "/log", "/log/metrik"})
            EXPECT_EQ(ModeOf(Data() + "/hublink" + directory), 0700u) << directory;
        EXPECT_EQ(ModeOf(Store()), 0600u);
        EXPECT_EQ(ColumnsOf("OperLog"), OPER_LOG_COLUMNS);
        EXPECT_EQ(ColumnsOf("BaseInfo"), "key TEXT0,value TEXT0");
        EXPECT_EQ(Ask("pragma user_version"), "2");
        EXPECT_EQ(Ask("pragma journal_mode"), "wal");
        EXPECT_EQ(Ask("pragma integrity_check"), "ok");
    }

    std::string PidFile() const { return Preferences() + "/Report.pid"; }

    static uid_t OwnerOf(const std::string& path) {
        struct stat status {};
        return ::lstat(path.c_str(), &status) == 0 ? status.st_uid : static_cast<uid_t>(-1);
    }

    std::string Files() const {
        std::string names;
        for (const auto& entry : fs::directory_iterator(Database()))
            names += entry.path().filename().string() + " ";
        return names;
    }
};

TEST_F(Setup, MakesEverythingThatIsMissing) {
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("made directory " + Preferences() + " (mode 1777)\n")) << outcome.output;
    EXPECT_TRUE(outcome.Says("made pid file " + PidFile() + " (mode 0666)\n")) << outcome.output;
    EXPECT_EQ(ContentOf(PidFile()), "");
    EXPECT_TRUE(outcome.Says("made store " + Store() + " (mode 0600, schema version 2)\n"));
    ExpectEverythingMade();
    EXPECT_EQ(Files(), "Report.db ");
}

TEST_F(Setup, GivesTheSameModesWhateverTheUmask) {
    for (const auto* umask : {"umask 0 &&", "umask 0777 &&"}) {
        EXPECT_EQ(RunSetup("", umask).exitCode, 0);
        ExpectEverythingMade();
        EXPECT_EQ(ModeOf(Data()), 0700u);
        EXPECT_EQ(ModeOf(fs::path(Preferences()).parent_path()), 0755u);
        fs::remove_all(Data());
        fs::remove_all(fs::path(Preferences()).parent_path());
    }
}

TEST_F(Setup, ChangesNothingTheSecondTimeAndSaysSo) {
    ASSERT_EQ(RunSetup("--open-id u1").exitCode, 0);
    const auto before = Everything();
    const auto outcome = RunSetup("--open-id u1");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_TRUE(outcome.Says("already there: store " + Store())) << outcome.output;
    EXPECT_TRUE(outcome.Says("nothing to do")) << outcome.output;
    EXPECT_FALSE(outcome.Says("made")) << outcome.output;
    EXPECT_TRUE(Everything() == before);
}

TEST_F(Setup, SaysWhatItWouldMakeAndMakesNothing) {
    const auto before = Everything();
    const auto outcome = RunSetup("--dry-run --open-id u1");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("would make directory " + Preferences())) << outcome.output;
    EXPECT_TRUE(outcome.Says("would make pid file " + PidFile())) << outcome.output;
    EXPECT_TRUE(outcome.Says("would make store " + Store()));
    EXPECT_TRUE(outcome.Says("would set OpenID to \"u1\""));
    EXPECT_TRUE(Everything() == before);
}

TEST_F(Setup, StoresTheOpenIdAndTheVersion) {
    EXPECT_EQ(RunSetup("--open-id u1 --suite-version 5.1.0.2").exitCode, 0);
    EXPECT_EQ(Ask("select group_concat(key || '=' || value) from BaseInfo"),
              "OpenID=u1,HubLinkVersion=5.1.0.2");
}

TEST_F(Setup, ReplacesTheOpenIdAndKeepsTheRest) {
    EXPECT_EQ(RunSetup("--open-id u1 --suite-version 5.1.0.2").exitCode, 0);
    EXPECT_EQ(RunSetup("--open-id u2").exitCode, 0);
    EXPECT_EQ(Ask("select group_concat(key || '=' || value) from BaseInfo"),
              "OpenID=u2,HubLinkVersion=5.1.0.2");
}

TEST_F(Setup, ReplacesEveryRowOfAKeyThatOthersStoredTwice) {
    ASSERT_EQ(RunSetup("--open-id u1").exitCode, 0);
    SQLite::Database(Store(), SQLite::OPEN_READWRITE)
        .exec("insert into BaseInfo values ('OpenID', 'u2'), ('openid', 'other')");
    EXPECT_EQ(RunSetup("--open-id u1").exitCode, 0);
    EXPECT_EQ(Ask("select group_concat(key || '=' || value) from BaseInfo"),
              "OpenID=u1,OpenID=u1,openid=other");
}

TEST_F(Setup, StoresATextThatLooksLikeSqlAsItIsAndWarnsOfTheQuote) {
    const auto outcome = RunSetup("--open-id \"x'); drop table OperLog; --\"");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(
        outcome.Says("warning: \"x'); drop table OperLog; --\" holds a single quote: the service will not "
                     "be able to store any report while it is set"))
        << outcome.output;
    EXPECT_EQ(Ask("select value from BaseInfo"), "x'); drop table OperLog; --");
    EXPECT_EQ(ColumnsOf("OperLog"), OPER_LOG_COLUMNS);
}

TEST_F(Setup, WarnsOfAQuoteThatIsWrittenTwiceInOtherWords) {
    const auto outcome = RunSetup("--open-id \"x''y\"");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(
        outcome.Says("warning: \"x''y\" holds a single quote written twice: it is stored as one quote, and "
                     "goes to analytics as two"))
        << outcome.output;
    EXPECT_FALSE(outcome.Says("not be able to store")) << outcome.output;
    EXPECT_EQ(Ask("select value from BaseInfo"), "x''y");
}

TEST_F(Setup, RefusesAnEmptyOpenId) {
    const auto outcome = RunSetup("--open-id ''");
    EXPECT_GE(outcome.exitCode, 100);
    EXPECT_TRUE(outcome.Says("an empty text would have no effect")) << outcome.output;
    EXPECT_FALSE(fs::exists(Data()));
}

TEST_F(Setup, TellsHowToGetTheRightToThePreferencesDirectoryAndDoesTheRest) {
    // No user, not even root, can make a directory there.
    const auto outcome = Reportctl("setup --preferences-dir /sys/reportctl-test/hublink");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("Run: sudo install -d -m 1777 /sys/reportctl-test/hublink && "
                             "sudo install -m 0666 /dev/null /sys/reportctl-test/hublink/Report.pid\n"))
        << outcome.output;
    EXPECT_EQ(ModeOf(Store()), 0600u);
}

TEST_F(Setup, QuotesThePathInTheCommandThatItTells) {
    const auto outcome = Reportctl("setup --preferences-dir \"/sys/it's here\"");
    EXPECT_TRUE(outcome.Says("sudo install -d -m 1777 '/sys/it'\\''s here' && "
                             "sudo install -m 0666 /dev/null '/sys/it'\\''s here/Report.pid'\n"))
        << outcome.output;
}

TEST_F(Setup, CorrectsTheModeOfThePreferencesDirectory) {
    fs::create_directories(Preferences());
    fs::permissions(Preferences(), fs::perms{0777});
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_TRUE(outcome.Says("changed directory " + Preferences() + " (mode 1777)")) << outcome.output;
    EXPECT_EQ(ModeOf(Preferences()), 01777u);
}

TEST_F(Setup, DoesNotOpenToAllWhatALinkPointsTo) {
    const auto target = fs::path(Preferences()).parent_path() / "target";
    fs::create_directories(target);
    fs::permissions(target, fs::perms{0700});
    fs::create_symlink(target, Preferences());
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says(Preferences() + " is not a directory")) << outcome.output;
    EXPECT_EQ(ModeOf(target), 0700u);
    EXPECT_TRUE(fs::exists(Store()));
}

TEST_F(Setup, LeavesThePidFileOfARunningServiceAlone) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    std::ofstream(PidFile()) << "4711";
    struct stat before {};
    ASSERT_EQ(::lstat(PidFile().c_str(), &before), 0);
    EXPECT_EQ(RunSetup().exitCode, 0);
    struct stat after {};
    ASSERT_EQ(::lstat(PidFile().c_str(), &after), 0);
    EXPECT_EQ(after.st_ino, before.st_ino);
    EXPECT_EQ(ContentOf(PidFile()), "4711");
}

TEST_F(Setup, RefusesALinkInThePlaceOfThePidFile) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    fs::remove(PidFile());
    fs::create_symlink(Preferences() + "/target", PidFile());
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says(PidFile() + " is no regular file. Remove it")) << outcome.output;
    EXPECT_FALSE(fs::exists(Preferences() + "/target"));
}

TEST_F(Setup, TellsHowAPidFileBecomesWritableForAll) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    fs::permissions(PidFile(), fs::perms{0644});
    EXPECT_TRUE(RunSetup().Says("Run: sudo chmod 0666 " + PidFile() + "\n"));
    EXPECT_EQ(ModeOf(PidFile()), 0644u);
}

TEST_F(Setup, OfManyAtOnceEachSaysWhatItMade) {
    const auto one =
        "XDG_DATA_HOME='" + Data() + "' '" REPORTCTL "' setup --preferences-dir '" + Preferences() + "'";
    const auto outcome = Run("for i in 1 2 3 4 5 6 7 8; do (" + one + "; echo \"code $?\") & done; wait");
    const auto count = [&outcome](const std::string& text) {
        int found = 0;
        for (auto at = outcome.output.find(text); at != std::string::npos;
             at = outcome.output.find(text, at + 1))
            ++found;
        return found;
    };
    EXPECT_EQ(count("code 0"), 8) << outcome.output;
    EXPECT_EQ(count("error: "), 0) << outcome.output;
    for (const auto& thing : {"directory " + Preferences() + " ", "directory " + Data() + "/hublink ",
                              "directory " + Database() + " ", "pid file " + PidFile(), "store " + Store()})
        EXPECT_EQ(count("made " + thing), 1) << thing << "\n" << outcome.output;
    ExpectEverythingMade();
}

TEST_F(Setup, SaysSoWhenItsWordsCannotBeWritten) {
    const auto outcome = RunSetup("2>&1 >/dev/full; }", "{");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, "error: cannot write to standard output: No space left on device\n");
    const auto closed = RunSetup("2>&1 >&-; }", "{");
    EXPECT_EQ(closed.exitCode, 1);
    EXPECT_EQ(closed.output, "error: cannot write to standard output: Bad file descriptor\n");
    ExpectEverythingMade();
    EXPECT_EQ(Reportctl("--help >/dev/full").exitCode, 1) << "standard error is as full there";
}

/// The directory for pid files belongs to another user than the one who runs set-up. A test that runs as root
/// must make these users.
class SetupInAnothersDirectory : public Setup {
protected:
    static constexpr uid_t NOBODY = OtherUser::ID;

    void SetUp() override {
        if (::geteuid() != 0)
            GTEST_SKIP() << "only root can give a directory to another user";
        ASSERT_EQ(RunSetup().exitCode, 0);
        fs::remove(PidFile());
    }

    /// Runs a copy of the program as the other user, who can reach the copy and has a data directory of its
    /// own.
    Outcome RunSetupAsNobody() const {
        const auto root = fs::path(Data()).parent_path();
        fs::permissions(root, fs::perms{0755});
        fs::copy_file(REPORTCTL, root / "program", fs::copy_options::overwrite_existing);
        fs::create_directories(root / "nobody");
        if (::chown((root / "nobody").c_str(), NOBODY, NOBODY) != 0)
            return {};
        return Run("setpriv --reuid 65534 --regid 65534 --clear-groups env XDG_DATA_HOME='" +
                   (root / "nobody").string() + "' '" + (root / "program").string() +
                   "' setup --preferences-dir '" + Preferences() + "'");
    }
};

TEST_F(SetupInAnothersDirectory, GivesThePidFileToItsOwnerAsRoot) {
    ASSERT_EQ(::chown(Preferences().c_str(), NOBODY, NOBODY), 0);
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_EQ(OwnerOf(PidFile()), NOBODY);
    EXPECT_EQ(ModeOf(PidFile()), 0666u);
}

TEST_F(SetupInAnothersDirectory, MakesNoPidFileThatWouldKeepOthersOutAndTellsTheCommand) {
    const auto outcome = RunSetupAsNobody();
    EXPECT_EQ(outcome.exitCode, 1) << outcome.output;
    EXPECT_TRUE(outcome.Says("Run: sudo install -m 0666 /dev/null " + PidFile() + "\n")) << outcome.output;
    EXPECT_FALSE(fs::exists(PidFile()));
}

TEST_F(SetupInAnothersDirectory, AsksNothingOfAUserWhenThePidFileIsThere) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    const auto outcome = RunSetupAsNobody();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_FALSE(outcome.Says("warning")) << outcome.output;
}

TEST_F(SetupInAnothersDirectory, AsRootMakesNothingInAnothersHomeAndTellsTheCommand) {
    const auto home = fs::path(Data()).parent_path() / "nobody's";
    fs::create_directories(home);
    ASSERT_EQ(::chown(home.c_str(), NOBODY, NOBODY), 0);
    for (const std::string isDry : {"", " --dry-run"}) {
        const auto outcome =
            Run("XDG_DATA_HOME=\"" + home.string() + "/.data\" '" REPORTCTL "' setup --preferences-dir '" +
                Preferences() + "'" + isDry);
        EXPECT_EQ(outcome.exitCode, 1) << outcome.output;
        EXPECT_TRUE(outcome.Says("error: " + home.string() + " belongs to nobody, and set-up runs as root"))
            << outcome.output;
        EXPECT_TRUE(outcome.Says("Run: sudo -u nobody env XDG_DATA_HOME='" + home.parent_path().string() +
                                 "/nobody'\\''s/.data' reportctl setup\n"))
            << outcome.output;
        EXPECT_TRUE(fs::is_empty(home));
    }
}

TEST_F(SetupInAnothersDirectory, WarnsOfAPidFileThatKeepsOthersOut) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    ASSERT_EQ(::chown(PidFile().c_str(), NOBODY, NOBODY), 0);
    EXPECT_TRUE(RunSetup().Says("Run: sudo chown --no-dereference 0 " + PidFile() + "\n"));
}

TEST_F(Setup, MakesTheUsersOwnDirectoriesPrivate) {
    fs::create_directories(Database());
    fs::permissions(Database(), fs::perms{0755});
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_TRUE(outcome.Says("changed directory " + Database() + " (mode 0700)")) << outcome.output;
    EXPECT_EQ(ModeOf(Database()), 0700u);
}

TEST_F(Setup, LetsTheUserKeepTheDataBehindALink) {
    const auto elsewhere = Data() + "/elsewhere";
    fs::create_directories(elsewhere);
    fs::create_symlink(elsewhere, Data() + "/hublink");
    EXPECT_EQ(RunSetup().exitCode, 0);
    EXPECT_EQ(ModeOf(elsewhere), 0700u);
    EXPECT_TRUE(fs::exists(elsewhere + "/database/Report.db"));
}

TEST_F(Setup, FailsOverAFileInTheWayOfADirectory) {
    fs::create_directories(Data());
    std::ofstream(Data() + "/hublink") << "in the way";
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says(Data() + "/hublink is not a directory. Move it away")) << outcome.output;
    EXPECT_EQ(ContentOf(Data() + "/hublink"), "in the way");
}

TEST_F(Setup, KeepsUnderAnotherNameWhatALostStoreLeftBehind) {
    fs::create_directories(Database());
    for (const auto* suffix : {"-wal", "-shm", "-journal", ".left-1-wal"})
        std::ofstream(Store() + suffix) << "rows of " << suffix;
    const auto outcome = RunSetup();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("renamed " + Store() + "-wal, which belonged to a store that is gone, to " +
                             Store() + ".left-2-wal\n"))
        << outcome.output;
    ExpectEverythingMade();
    EXPECT_EQ(ContentOf(Store() + ".left-1-wal"), "rows of .left-1-wal");
    for (const std::string suffix : {"-wal", "-shm", "-journal"})
        EXPECT_EQ(ContentOf(Store() + ".left-2" + suffix), "rows of " + suffix);
}

TEST_F(Setup, RenamesNothingInADryRun) {
    fs::create_directories(Database());
    std::ofstream(Store() + "-wal") << "rows";
    const auto before = Everything();
    EXPECT_TRUE(RunSetup("--dry-run").Says("would rename " + Store() + "-wal"));
    EXPECT_TRUE(Everything() == before);
}

TEST_F(Setup, MakesNoStoreBesideALeftOverLogThatItCannotRename) {
    // A directory on which something is mounted cannot be renamed, not even by root.
    const std::string withMounts = "unshare --user --map-root-user --mount ";
    if (Run(withMounts + "true").exitCode != 0)
        GTEST_SKIP() << "this machine does not allow user namespaces";
    const auto log = Store() + "-wal";
    fs::create_directories(log);
    const auto outcome =
        RunSetup("", withMounts + "sh -c 'mount -t tmpfs none \"$0\" && exec env \"$@\"' '" + log + "'");
    EXPECT_EQ(outcome.exitCode, 1) << outcome.output;
    EXPECT_TRUE(outcome.Says("Not renamed: " + log)) << outcome.output;
    EXPECT_FALSE(fs::exists(Store()));
}

TEST_F(Setup, MakesTheStorePrivateThatOthersCouldRead) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    fs::permissions(Store(), fs::perms{0644});
    EXPECT_TRUE(RunSetup("--dry-run").Says("would change mode of " + Store() + " to 0600\ndry run"));
    EXPECT_EQ(ModeOf(Store()), 0644u);
    EXPECT_TRUE(RunSetup().Says("changed mode of " + Store() + " to 0600\n"));
    EXPECT_EQ(ModeOf(Store()), 0600u);
}

TEST_F(Setup, WorksWhileTheStoreIsInUse) {
    ASSERT_EQ(RunSetup().exitCode, 0);
    SQLite::Database service(Store(), SQLite::OPEN_READWRITE);
    service.exec("insert into OperLog (eventID) values ('x')");
    EXPECT_EQ(RunSetup("--open-id u1").exitCode, 0);
    service.exec("insert into OperLog (eventID) values ('y')");
    EXPECT_EQ(Ask("select (select count(*) from OperLog) || value from BaseInfo"), "2u1");
}

TEST_F(Setup, SaysNothingWhenItIsToBeQuietAndAllGoesWell) {
    for (const auto* when : {"the first time", "again"}) {
        const auto outcome = RunSetup("--quiet");
        EXPECT_EQ(outcome.exitCode, 0) << when;
        EXPECT_EQ(outcome.output, "") << when;
    }
    ExpectEverythingMade();
}

TEST_F(Setup, TellsWhatGoesWrongAlsoWhenItIsToBeQuiet) {
    fs::create_directories(Data() + "/hublink");
    std::ofstream(Data() + "/hublink/database") << "in the way";
    const auto outcome = RunSetup("--quiet");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.output.starts_with("error: " + Database() + " is not a directory."))
        << outcome.output;
}

TEST_F(Setup, ExplainsItsExitCodes) {
    for (const auto* arguments : {"--help", "setup --help"}) {
        const auto outcome = Reportctl(arguments);
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_TRUE(outcome.Says("Exit codes: 0 done")) << outcome.output;
    }
}

TEST_F(Setup, DoesNothingForACommandLineThatItDoesNotUnderstand) {
    for (const auto* arguments : {"", "nonsense", "setup --nonsense"})
        EXPECT_GE(Reportctl(arguments).exitCode, 100) << arguments;
    EXPECT_FALSE(fs::exists(Data()));
}

} // namespace
