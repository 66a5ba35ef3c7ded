#include "ssoClientRuntime/TrustStore.h"

#include "ssoClient/Exceptions.h"
#include "support/Failure.h"
#include "support/FixedClock.h"
#include "support/TestData.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <gmock/gmock.h>

#include <atomic>
#include <condition_variable>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <thread>
#include <unistd.h>
#include <vector>

using namespace SsoClient;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

namespace fs = std::filesystem;
using Quillon::Crypto::Certificate;

std::string ReadCertificate(const std::string& name)
{
    return ReadTestData("keys/" + name + "-cert.pem");
}

std::string GetFingerprint(const std::string& name)
{
    return GetTestCertificates(name).front()->GetFingerprint();
}

/** Keeps what it is told, and lets a test wait for it. */
class Noting final : public TrustObserver
{
public:
    void OnAdded(const Certificate& certificate) noexcept override
    {
        Note("added " + certificate.GetFingerprint());
    }
    void OnRemoved(const Certificate& certificate) noexcept override
    {
        Note("removed " + certificate.GetFingerprint());
    }
    void OnExpiring(const Certificate& certificate) noexcept override
    {
        Note("expiring " + certificate.GetFingerprint());
    }
    void OnReloadFailed(const std::string& reason) noexcept override { Note("failed " + reason); }

    std::vector<std::string> Get() const
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        return _notes;
    }

    /** Returns when there are that many. */
    void Await(std::size_t count)
    {
        std::unique_lock<std::mutex> lock(_mutex);
        _changed.wait(lock, [&] { return _notes.size() >= count; });
    }

private:
    void Note(const std::string& note)
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        _notes.push_back(note);
        _changed.notify_all();
    }

    mutable std::mutex _mutex;
    std::condition_variable _changed;
    std::vector<std::string> _notes;
};

class Trust : public testing::Test
{
protected:
    Trust()
    {
        options.observer = observer;
        options.followsChanges = false;
        Write("a.pem", "sts");
    }
    ~Trust() override { fs::remove_all(folder); }

    /** Puts a file in its place as a whole. */
    void Write(const std::string& file, const std::string& certificate) const
    {
        WriteText(file, ReadCertificate(certificate));
    }
    void WriteText(const std::string& file, const std::string& text) const
    {
        std::ofstream(folder / "new") << text;
        fs::rename(folder / "new", folder / file);
    }

    std::vector<std::string> GetTrusted(const TrustStore& store) const
    {
        std::vector<std::string> fingerprints;
        for (const auto& certificate : *store.Get()) {
            fingerprints.push_back(certificate->GetFingerprint());
        }
        return fingerprints;
    }

    std::string GetCreateFailure(const fs::path& path) const
    {
        return GetFailure([&] { CreateTrustStore(path, options); });
    }

    static fs::path MakeFolder()
    {
        std::string name = (fs::temp_directory_path() / "trust-XXXXXX").string();
        return mkdtemp(name.data());
    }

    const fs::path folder = MakeFolder();
    const std::string sts = GetFingerprint("sts");
    const std::string client = GetFingerprint("client");
    boost::shared_ptr<Noting> observer = boost::make_shared<Noting>();
    TrustStoreOptions options;
    FixedClock clock{"2026-06-15T12:00:00Z"}; // when the tokens of the test data are valid
};

} // namespace

TEST_F(Trust, IsReadFromAFile)
{
    const auto store = CreateTrustStore(folder / "a.pem", options);
    EXPECT_THAT(GetTrusted(*store), ElementsAre(sts));
    EXPECT_EQ(store->GetFailure(), "");
    EXPECT_THAT(observer->Get(), ElementsAre("added " + sts));
}

TEST_F(Trust, IsReadFromTheCertificateFilesOfAFolder)
{
    Write("c.cer", "client");
    Write("b.crt", "sts"); // once is enough
    WriteText("README.txt", "no certificate");
    EXPECT_THAT(GetTrusted(*CreateTrustStore(folder, options)), ElementsAre(sts, client));
}

TEST_F(Trust, BeginsWithFilesThatCanBeUsed)
{
    EXPECT_THAT(
        GetCreateFailure(folder / "none.pem"),
        HasSubstr(
            "CryptoException: Cannot take certificates from '" + folder.string() + "/none.pem': "));
    WriteText("z.pem", "no certificate");
    EXPECT_THAT(GetCreateFailure(folder), HasSubstr("z.pem': "));
    fs::remove(folder / "z.pem");
    fs::remove(folder / "a.pem");
    EXPECT_EQ(
        GetCreateFailure(folder),
        "CryptoException: Cannot take certificates from '" + folder.string()
            + "': the folder has no file *.pem, *.crt or *.cer");
}

TEST_F(Trust, RefusesTimesThatAreNone)
{
    options.longestAge = std::chrono::milliseconds(0);
    EXPECT_EQ(
        GetCreateFailure(folder),
        "InvalidArgumentException: Invalid argument : The longest age of certificates is not "
        "positive.");
    options = {};
    options.expiryNotice = std::chrono::hours(-1);
    EXPECT_EQ(
        GetCreateFailure(folder),
        "InvalidArgumentException: Invalid argument : The notice before an expiry is negative.");
}

TEST_F(Trust, ChangesWithTheFiles)
{
    const auto store = CreateTrustStore(folder, options);
    const auto before = store->Get();
    EXPECT_TRUE(store->Reload());
    EXPECT_EQ(store->Get(), before); // the same object: nothing has changed
    Write("b.pem", "client");
    EXPECT_TRUE(store->Reload());
    EXPECT_THAT(GetTrusted(*store), ElementsAre(sts, client));
    EXPECT_EQ(before->size(), 1U); // who has it keeps it
    fs::remove(folder / "a.pem");
    EXPECT_TRUE(store->Reload());
    EXPECT_THAT(GetTrusted(*store), ElementsAre(client));
    EXPECT_THAT(observer->Get(), ElementsAre("added " + sts, "added " + client, "removed " + sts));
}

TEST_F(Trust, StaysAsItIsIfTheFilesCannotBeUsed)
{
    const auto store = CreateTrustStore(folder, options);
    const auto before = store->Get();
    Write("b.pem", "client");
    WriteText("c.pem", ReadCertificate("client").substr(0, 200)); // half written
    EXPECT_FALSE(store->Reload());
    EXPECT_EQ(store->Get(), before);
    EXPECT_THAT(store->GetFailure(), HasSubstr("c.pem"));
    EXPECT_EQ(observer->Get().back(), "failed " + store->GetFailure());
    fs::remove_all(folder);
    EXPECT_FALSE(store->Reload());
    EXPECT_EQ(store->Get(), before);
    fs::create_directory(folder);
    Write("b.pem", "client");
    EXPECT_TRUE(store->Reload());
    EXPECT_EQ(store->GetFailure(), "");
    EXPECT_THAT(GetTrusted(*store), ElementsAre(client));
}

TEST_F(Trust, TellsOnceOfACertificateThatIsAboutToEnd)
{
    const auto certificate = GetTestCertificates("sts").front();
    const long long end = certificate->GetNotAfter().GetUtcTime();
    const long long notice = 30LL * 24 * 3600 * 1'000'000;
    {
        const FixedClock early(Quillon::System::DateTimeFromUtc(end - notice - 1, false));
        const auto store = CreateTrustStore(folder, options);
        EXPECT_THAT(observer->Get(), ElementsAre("added " + sts));
        const FixedClock late(Quillon::System::DateTimeFromUtc(end - notice, false));
        store->Reload();
        store->Reload();
    }
    EXPECT_THAT(observer->Get(), ElementsAre("added " + sts, "expiring " + sts));
}

TEST_F(Trust, TakesTheLongestNoticeForEver)
{
    options.expiryNotice = std::chrono::hours::max();
    CreateTrustStore(folder, options);
    EXPECT_THAT(observer->Get(), ElementsAre("added " + sts, "expiring " + sts));
}

TEST_F(Trust, IsSuppliedToNobodyElse)
{
    const auto store = CreateTrustStore(folder, options);
    EXPECT_EQ(
        GetFailure([&] { store->Supply(nullptr); }),
        "InvalidArgumentException: Invalid argument : There is no verifier.");
}

TEST_F(Trust, IsSuppliedToVerifiers)
{
    const std::string xml = ReadTestData("tokens/accepted/bearer.xml");
    const auto store = CreateTrustStore(folder / "a.pem", options);
    const auto verifier = CreateTokenVerifier(GetTestCertificates("client"));
    EXPECT_THROW(verifier->Verify(xml), InvalidSignatureException);
    store->Supply(verifier);
    EXPECT_NE(verifier->Verify(xml), nullptr);
    Write("a.pem", "client");
    store->Reload();
    EXPECT_THROW(verifier->Verify(xml), InvalidSignatureException);
}

TEST_F(Trust, FollowsAFileThatIsReplaced)
{
    options.followsChanges = true;
    const auto store = CreateTrustStore(folder / "a.pem", options);
    Write("a.pem", "client");
    observer->Await(3);
    EXPECT_THAT(observer->Get(), ElementsAre("added " + sts, "added " + client, "removed " + sts));
}

TEST_F(Trust, FollowsAFolderWhoseFilesChange)
{
    options.followsChanges = true;
    const auto store = CreateTrustStore(folder, options);
    Write("b.pem", "client");
    observer->Await(2);
    fs::remove(folder / "a.pem");
    observer->Await(3);
    EXPECT_THAT(GetTrusted(*store), ElementsAre(client));
}

/** How orchestrators replace mounted secrets: by a link to a folder that is renamed into place. */
TEST_F(Trust, FollowsALinkToAFolderThatIsReplaced)
{
    fs::create_directory(folder / "one");
    fs::create_directory(folder / "two");
    Write("one/x.pem", "sts");
    Write("two/x.pem", "client");
    fs::create_symlink("one", folder / "data");
    fs::create_symlink("data/x.pem", folder / "x.link.pem");
    options.followsChanges = true;
    const auto store = CreateTrustStore(folder / "x.link.pem", options);
    fs::create_symlink("two", folder / "next");
    fs::rename(folder / "next", folder / "data");
    observer->Await(3);
    EXPECT_THAT(GetTrusted(*store), ElementsAre(client));
}

TEST_F(Trust, FollowsByAgeWhereNobodyTells)
{
    fs::create_directory(folder / "far");
    Write("far/x.pem", "sts");
    fs::create_symlink("far/x.pem", folder / "x.pem");
    options.followsChanges = true;
    options.longestAge = std::chrono::milliseconds(20);
    const auto store = CreateTrustStore(folder / "x.pem", options);
    // The link's own folder does not change, and the file that it leads to is renamed away.
    Write("far/x.pem", "client");
    observer->Await(3);
    EXPECT_THAT(GetTrusted(*store), ElementsAre(client));
}

TEST_F(Trust, EndsAtAnyMoment)
{
    options.followsChanges = true;
    for (int i = 0; i < 6; ++i) {
        const auto store = CreateTrustStore(folder, options);
        Write("b.pem", i % 2 == 0 ? "client" : "sts");
    }
}

/** A service changes its key: first both certificates are there, then only the new one. */
TEST_F(Trust, RollsOverUnderLoad)
{
    const std::string old = ReadTestData("tokens/accepted/bearer.xml");
    const std::string forged = [&] {
        std::string text = old;
        text.at(text.size() / 2) ^= 1;
        return text;
    }();
    options.followsChanges = true;
    const auto store = CreateTrustStore(folder, options);
    const auto verifier = CreateTokenVerifier({});
    store->Supply(verifier);
    std::atomic<bool> isOver{false};
    std::atomic<unsigned> verified{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < 3; ++i) {
        threads.emplace_back([&] {
            while (!isOver) {
                EXPECT_EQ(verifier->Verify(old)->ToXml(), old);
                EXPECT_THROW(verifier->Verify(forged), Quillon::Exception);
                ++verified;
            }
        });
    }
    // The old certificate stays while the new one comes, in another file or in the same.
    for (int i = 0; i < 10; ++i) {
        Write("b.pem", "client");
        WriteText("a.pem", ReadCertificate("client") + ReadCertificate("sts"));
        fs::remove(folder / "b.pem");
        Write("a.pem", "sts");
    }
    while (verified < 100) {
        std::this_thread::yield();
    }
    isOver = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    Write("a.pem", "client");
    store->Reload();
    EXPECT_THROW(verifier->Verify(old), InvalidSignatureException);
}
