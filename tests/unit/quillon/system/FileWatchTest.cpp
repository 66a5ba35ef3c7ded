#include "quillon/system/FileWatch.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

using Quillon::System::FileWatch;

namespace {

namespace fs = std::filesystem;
using Outcome = FileWatch::Outcome;

constexpr std::chrono::minutes Generous(10); // a wait that no passing test reaches the end of

class Watched : public testing::Test
{
protected:
    ~Watched() override { fs::remove_all(folder); }

    void Write(const std::string& name) const { std::ofstream(folder / name) << "text"; }

    static fs::path MakeFolder()
    {
        std::string name = (fs::temp_directory_path() / "watch-XXXXXX").string();
        return mkdtemp(name.data());
    }

    const fs::path folder = MakeFolder();
};

} // namespace

TEST_F(Watched, TellsOfWhatChangesAfterItHasBegun)
{
    Write("file");
    FileWatch watch(folder / "file");
    watch.Begin();
    Write("file");
    EXPECT_EQ(watch.Wait(Generous), Outcome::CHANGED);
    watch.Begin();
    fs::remove(folder / "file");
    EXPECT_EQ(watch.Wait(Generous), Outcome::CHANGED);
    watch.Begin(); // there is none
    Write("new");
    fs::rename(folder / "new", folder / "file");
    EXPECT_EQ(watch.Wait(Generous), Outcome::CHANGED);
}

TEST_F(Watched, TellsOfWhatIsInAFolder)
{
    for (const std::string& path :
         {folder.string(), folder.string() + "/", folder.string() + "/."}) {
        FileWatch watch(path);
        watch.Begin();
        Write("file");
        EXPECT_EQ(watch.Wait(Generous), Outcome::CHANGED) << path;
    }
}

TEST_F(Watched, TellsNothingOfWhatLiesBesideAFolder)
{
    fs::create_directory(folder / "watched");
    FileWatch watch(folder / "watched");
    watch.Begin();
    Write("beside");
    EXPECT_EQ(watch.Wait(std::chrono::milliseconds(1)), Outcome::TIME_IS_OVER);
    fs::rename(folder / "watched", folder / "before");
    EXPECT_EQ(watch.Wait(Generous), Outcome::CHANGED);
}

TEST_F(Watched, WaitsNoLongerThanItMay)
{
    FileWatch watch(folder / "file");
    watch.Begin();
    EXPECT_EQ(watch.Wait(std::chrono::milliseconds(1)), Outcome::TIME_IS_OVER);
    EXPECT_EQ(watch.Wait(std::chrono::milliseconds(-1)), Outcome::TIME_IS_OVER);
}

TEST_F(Watched, MayWaitForEver)
{
    FileWatch watch(folder);
    watch.Begin();
    std::thread writer([&] { Write("file"); });
    EXPECT_EQ(watch.Wait(std::chrono::milliseconds::max()), Outcome::CHANGED);
    writer.join();
}

TEST_F(Watched, EndsEveryWaitWhenItIsStopped)
{
    FileWatch watch(folder);
    watch.Begin();
    std::thread stopper([&] { watch.Stop(); });
    EXPECT_EQ(watch.Wait(Generous), Outcome::STOPPED);
    EXPECT_EQ(watch.Wait(Generous), Outcome::STOPPED);
    stopper.join();
}

TEST_F(Watched, KnowsItsProcess)
{
    const FileWatch watch(folder);
    EXPECT_TRUE(watch.IsOwn());
    const pid_t child = fork();
    if (child == 0) {
        _exit(watch.IsOwn() ? 1 : 0);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
}
