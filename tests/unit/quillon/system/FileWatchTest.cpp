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
    EXPECT_TRUE(watch.Wait(Generous));
    watch.Begin();
    fs::remove(folder / "file");
    EXPECT_TRUE(watch.Wait(Generous));
    watch.Begin(); // there is none
    Write("new");
    fs::rename(folder / "new", folder / "file");
    EXPECT_TRUE(watch.Wait(Generous));
}

TEST_F(Watched, TellsOfWhatIsInAFolder)
{
    FileWatch watch(folder);
    watch.Begin();
    Write("file");
    EXPECT_TRUE(watch.Wait(Generous));
}

TEST_F(Watched, WaitsNoLongerThanItMay)
{
    FileWatch watch(folder / "file");
    watch.Begin();
    EXPECT_TRUE(watch.Wait(std::chrono::milliseconds(1)));
    EXPECT_TRUE(watch.Wait(std::chrono::milliseconds(-1)));
}

TEST_F(Watched, EndsEveryWaitWhenItIsStopped)
{
    FileWatch watch(folder);
    watch.Begin();
    std::thread stopper([&] { watch.Stop(); });
    EXPECT_FALSE(watch.Wait(Generous));
    EXPECT_FALSE(watch.Wait(Generous));
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
