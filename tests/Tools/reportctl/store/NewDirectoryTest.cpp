#include "Tools/reportctl/store/NewDirectory.h"

#include <filesystem>
#include <fstream>
#include <system_error>

#include <gtest/gtest.h>

#include "tests/support/ModeOf.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using reportctl::store::NewDirectory;

class TheNewDirectory : public testing::Test {
protected:
    std::string Path() const { return m_parent.Path() + "/new"; }

    /// The words of the system_error that the function throws.
    template <typename Function>
    static std::string WordsOf(Function function) {
        try {
            function();
        } catch (const std::system_error& error) {
            return error.what();
        }
        return "nothing was thrown";
    }

private:
    TemporaryDirectory m_parent;
};

TEST_F(TheNewDirectory, GoesWithWhatIsInItUnlessItIsKept) {
    {
        const NewDirectory directory(Path());
        EXPECT_EQ(ModeOf(Path()), 0700u);
        std::ofstream(Path() + "/file") << "half";
    }
    EXPECT_FALSE(std::filesystem::exists(Path()));
}

TEST_F(TheNewDirectory, StaysOnceItIsKept) {
    {
        NewDirectory directory(Path());
        directory.Keep();
    }
    EXPECT_TRUE(std::filesystem::exists(Path()));
}

TEST_F(TheNewDirectory, MustNotExistBefore) {
    std::filesystem::create_directory(Path());
    EXPECT_EQ(WordsOf([&] { const NewDirectory directory(Path()); }),
              "cannot make the directory " + Path() + ": File exists");
    EXPECT_TRUE(std::filesystem::exists(Path()));
}

TEST_F(TheNewDirectory, TellsWhyItCannotBeOpenedToBeWrittenToTheDisk) {
    NewDirectory directory(Path());
    std::filesystem::remove(Path());
    EXPECT_EQ(WordsOf([&] { directory.Keep(); }), "cannot write " + Path() + ": No such file or directory");
}

} // namespace
