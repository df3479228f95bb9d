#include "Plugin/ModuleLoader.h"

#include <fstream>
#include <optional>
#include <type_traits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/fakes/FakeModule.h"
#include "tests/support/OtherThread.h"
#include "tests/support/TemporaryDirectory.h"

using ::testing::HasSubstr;

namespace {

using Loader = SystemTool::ModuleLoader<IFakeModule>;

std::string PathOf(const std::string& library) {
    return SystemTool::IO::Directory::GetExcutableDirectory() + library;
}

const std::string MODULE = "libModule.dylib";
const std::string WITHOUT_CREATE_MODULE = "libModuleWithoutCreate.dylib";
const std::string WITHOUT_DESTORY_MODULE = "libModuleWithoutDestory.dylib";
const std::string NULL_MODULE = "libModuleNull.dylib";

FakeModuleState& StateOf(const std::string& library) {
    return FakeState<FakeModuleState>(library);
}

bool IsMapped(const std::string& library) {
    std::ifstream maps("/proc/self/maps");
    for (std::string line; std::getline(maps, line);)
        if (line.find(library) != std::string::npos)
            return true;
    return false;
}

} // namespace

static_assert(!std::is_copy_constructible_v<Loader> && !std::is_copy_assignable_v<Loader>);

TEST(ModuleLoader, LoadsWhenConstructedAndGivesTheObject) {
    Loader loader(PathOf(MODULE));
    ASSERT_NE(loader.GetModule(), nullptr);
    EXPECT_EQ(loader.GetModule()->Answer(), 42);
    EXPECT_EQ(loader.GetLastError(), "");
}

TEST(ModuleLoader, NamesTheModuleAfterTheFile) {
    EXPECT_EQ(Loader(PathOf(MODULE)).GetModuleName(), MODULE);
    EXPECT_EQ(Loader("/no/such/libAny.dylib").GetModuleName(), "libAny.dylib");
    EXPECT_EQ(Loader(R"(C:\no\such\any.dll)").GetModuleName(), "any.dll");
}

TEST(ModuleLoader, APathWithoutADirectoryGivesAnEmptyName) {
    EXPECT_EQ(Loader("libNoSuch.dylib").GetModuleName(), "");
    EXPECT_EQ(Loader("").GetModuleName(), "");
}

TEST(ModuleLoader, APathThatCannotBeTransformedLeavesTheNameAsItIs) {
    EXPECT_EQ(Loader(std::string("/a/b\0c", 6)).GetModuleName(), "");
}

TEST(ModuleLoader, AnEmptyPathIsAQuietFailure) {
    Loader loader("");
    EXPECT_FALSE(loader.Load());
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_EQ(loader.GetLastError(), "");
}

TEST(ModuleLoader, AMissingFileIsAFailureWithTheLoadersOwnText) {
    const std::string path = "/no/such/directory/libAny.dylib";
    Loader loader(path);
    EXPECT_FALSE(loader.Load());
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_THAT(loader.GetLastError(), HasSubstr(path));
    EXPECT_THAT(loader.GetLastError(), HasSubstr("No such file or directory"));
}

TEST(ModuleLoader, AFileThatIsNoLibraryIsAFailureThatSaysSo) {
    const TemporaryDirectory directory;
    const std::string path = directory.Path() + "/libText.dylib";
    std::ofstream(path) << "not a library";
    Loader loader(path);
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_THAT(loader.GetLastError(), HasSubstr("file too short"));
}

TEST(ModuleLoader, AFailedLoadCanBeTriedAgain) {
    const TemporaryDirectory directory;
    const std::string path = directory.Path() + "/" + MODULE;
    Loader loader(path);
    EXPECT_EQ(loader.GetModule(), nullptr);
    std::filesystem::copy_file(PathOf(MODULE), path);
    EXPECT_TRUE(loader.Load());
    ASSERT_NE(loader.GetModule(), nullptr);
    EXPECT_EQ(loader.GetModule()->Answer(), 42);
}

TEST(ModuleLoader, ALibraryWithoutCreateModuleFailsOnceAndStaysOpen) {
    Loader loader(PathOf(WITHOUT_CREATE_MODULE));
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_EQ(loader.GetLastError(), "No CreateModule func export,please check your dll export regular:" +
                                         PathOf(WITHOUT_CREATE_MODULE));
    EXPECT_TRUE(IsMapped(WITHOUT_CREATE_MODULE));
    EXPECT_TRUE(loader.Load()) << "the library is open, and that is all the second call looks at";
    EXPECT_EQ(loader.GetModule(), nullptr);
}

TEST(ModuleLoader, ANullObjectIsStoredAsItIs) {
    Loader loader(PathOf(NULL_MODULE));
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_EQ(loader.GetLastError(), "");
    EXPECT_EQ(StateOf(NULL_MODULE).created, 1);
    EXPECT_TRUE(loader.Load());
}

TEST(ModuleLoader, APluginsOwnExceptionCanBeReadByWhoCatchesIt) {
    try {
        Loader loader(PathOf("libModuleThrows.dylib"));
        FAIL() << "nothing was thrown";
    } catch (const std::exception& error) {
        EXPECT_STREQ(error.what(), "the plug-in's own error");
    }
}

TEST(ModuleLoader, HasNothingToLoadOrUnloadOnceThePluginsFactoryHasThrown) {
    const TemporaryDirectory directory;
    const std::string path = directory.Path() + "/libLate.dylib";
    Loader loader(path);
    std::filesystem::copy_file(PathOf("libModuleThrows.dylib"), path);
    EXPECT_THROW(loader.Load(), std::exception);
    EXPECT_FALSE(loader.Load());
    EXPECT_EQ(loader.GetLastError(), "Dll loader is null when loading:" + path);
    EXPECT_EQ(loader.GetModule(), nullptr);
    EXPECT_FALSE(loader.Unload());
}

TEST(ModuleLoader, LoadingTwiceMakesOneObject) {
    Loader loader(PathOf(MODULE));
    IFakeModule* const first = loader.GetModule();
    EXPECT_TRUE(loader.Load());
    EXPECT_EQ(loader.GetModule(), first);
    EXPECT_EQ(StateOf(MODULE).created, 1);
}

TEST(ModuleLoader, UnloadGivesTheObjectBackAndKeepsThePointer) {
    FakeModuleState& state = StateOf(MODULE);
    Loader loader(PathOf(MODULE));
    IFakeModule* const object = loader.GetModule();
    EXPECT_TRUE(loader.Unload());
    EXPECT_EQ(state.destroyed, 1);
    EXPECT_EQ(state.lastDestroyed, object);
    EXPECT_EQ(loader.GetModule(), object);
    EXPECT_TRUE(loader.Unload()) << "nothing is open any more";
    EXPECT_EQ(state.destroyed, 1);
}

TEST(ModuleLoader, ANullObjectIsGivenBackToo) {
    FakeModuleState& state = StateOf(NULL_MODULE);
    { Loader loader(PathOf(NULL_MODULE)); }
    EXPECT_EQ(state.destroyed, 1) << "the plug-in may have more to release than an object";
    EXPECT_EQ(state.lastDestroyed, nullptr);
}

TEST(ModuleLoader, LoadAndUnloadWaitForALoadOnAnotherThread) {
    FakeModuleState& state = StateOf(MODULE);
    Loader loader(PathOf(MODULE));
    loader.Unload();
    std::optional<OtherThread> load;
    std::optional<OtherThread> unload;
    state.onCreate = [&] {
        load.emplace([&] { EXPECT_TRUE(loader.Load()); });
        EXPECT_TRUE(load->Waits());
        unload.emplace([&] { EXPECT_TRUE(loader.Unload()); });
        EXPECT_TRUE(unload->Waits());
    };
    EXPECT_TRUE(loader.Load());
}

TEST(ModuleLoader, LoadAndUnloadWaitForAnUnloadOnAnotherThread) {
    FakeModuleState& state = StateOf(MODULE);
    Loader loader(PathOf(MODULE));
    std::optional<OtherThread> load;
    std::optional<OtherThread> unload;
    state.onDestroy = [&] {
        load.emplace([&] { EXPECT_TRUE(loader.Load()); });
        EXPECT_TRUE(load->Waits());
        unload.emplace([&] { EXPECT_TRUE(loader.Unload()); });
        EXPECT_TRUE(unload->Waits());
    };
    EXPECT_TRUE(loader.Unload());
}

TEST(ModuleLoader, UnloadClosesTheLibrary) {
    Loader loader(PathOf(MODULE));
    EXPECT_TRUE(IsMapped(MODULE));
    loader.Unload();
    EXPECT_FALSE(IsMapped(MODULE));
}

TEST(ModuleLoader, UnloadOfALibraryThatNeverOpenedIsTrueAndCallsNothing) {
    Loader loader("/no/such/directory/libAny.dylib");
    EXPECT_TRUE(loader.Unload());
}

TEST(ModuleLoader, TheDestructorGivesTheObjectBackOnce) {
    FakeModuleState& state = StateOf(MODULE);
    { Loader loader(PathOf(MODULE)); }
    EXPECT_EQ(state.destroyed, 1);
    {
        Loader loader(PathOf(MODULE));
        loader.Unload();
    }
    EXPECT_EQ(state.destroyed, 2);
    { Loader loader("/no/such/directory/libAny.dylib"); }
    EXPECT_EQ(state.destroyed, 2);
}

TEST(ModuleLoader, UnloadWithoutDestoryModuleThrows) {
    // Never destroyed, because its destructor would end the process: see the death test.
    static auto* const loader = new Loader(PathOf(WITHOUT_DESTORY_MODULE));
    EXPECT_THROW(loader->Unload(), boost::system::system_error);
    EXPECT_TRUE(loader->Load()) << "the mutex was released on the way out, and the library is still open";
}

TEST(ModuleLoaderDeathTest, DestroyingALoaderWithoutDestoryModuleEndsTheProcess) {
    EXPECT_EXIT({ Loader loader(PathOf(WITHOUT_DESTORY_MODULE)); }, ::testing::KilledBySignal(SIGABRT),
                "DestoryModule");
}

TEST(ModuleLoader, EachLoaderOfOneLibraryHasItsOwnObject) {
    FakeModuleState& state = StateOf(MODULE);
    Loader one(PathOf(MODULE));
    Loader other(PathOf(MODULE));
    EXPECT_NE(one.GetModule(), other.GetModule());
    one.Unload();
    EXPECT_EQ(other.GetModule()->Answer(), 42) << "the library stays while a loader holds it";
    EXPECT_EQ(state.created, 2);
    EXPECT_EQ(state.destroyed, 1);
}
