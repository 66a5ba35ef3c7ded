#include "HttpClient.h"
#include "NameLookup.h"

#include "quillon/service/Logger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <latch>
#include <vector>

using namespace Quillon::Http;
using namespace Testing;
using Quillon::Exception;
using Quillon::Ref;

namespace {

/** Keeps what a completion was called with. */
struct Completed
{
    Completion GetCompletion()
    {
        return [this](const Exception* error, ClientResponse* response, PendingRequestItem* item) {
            hadItem = item != nullptr;
            thread = std::this_thread::get_id();
            errorText = error != nullptr ? error->what() : "";
            body = response != nullptr ? ToReply(*response).body : "";
            ++calls;
            if (calls == 1) {
                called.set_value();
            }
        };
    }

    std::promise<void> called;
    bool hadItem = false;
    std::thread::id thread;
    std::string errorText;
    std::string body;
    int calls = 0;
};

TEST(SendRequestAsync, CallsTheCompletionOnAnotherThread)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    Completed completed;
    const Ref<PendingRequestItem> pending =
        client.Start(HttpClient::MakeRequest(), completed.GetCompletion());
    completed.called.get_future().wait();
    EXPECT_EQ("", completed.errorText);
    EXPECT_EQ("pong", completed.body);
    EXPECT_TRUE(completed.hadItem);
    EXPECT_NE(std::this_thread::get_id(), completed.thread);
    EXPECT_FALSE(pending->Cancel());
    EXPECT_EQ(1, completed.calls);
}

TEST(SendRequestAsync, GivesTheCompletionTheFailure)
{
    const TestServer server(AnswerAndClose(""));
    HttpClient client(server);
    Completed completed;
    const Ref<PendingRequestItem> pending =
        client.Start(HttpClient::MakeRequest(), completed.GetCompletion());
    completed.called.get_future().wait();
    EXPECT_EQ(
        "The server " + Describe(server) + " closed the connection without a reply.",
        completed.errorText);
    EXPECT_EQ("", completed.body);
}

TEST(SendRequestAsync, TellsTheCompletionOfATimeOut)
{
    const TestServer server([](ServerConnection& connection) { connection.WaitForClose(); });
    HttpClient client(server);
    const Ref<ClientRequest> request = HttpClient::MakeRequest();
    request->SetTimeout(Short);
    Completed completed;
    const Ref<PendingRequestItem> pending = client.Start(request, completed.GetCompletion());
    completed.called.get_future().wait();
    EXPECT_EQ(
        "There was no complete reply from " + Describe(server) + " within 0.05 seconds.",
        completed.errorText);
}

TEST(SendRequestAsync, CompletesAfterItsAgentIsGone)
{
    std::promise<void> mayAnswer;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        mayAnswer.get_future().wait();
        connection.Write(MakeReply("200 OK", "pong"));
    });
    Completed completed;
    const Ref<PendingRequestItem> pending =
        HttpClient(server).Start(HttpClient::MakeRequest(), completed.GetCompletion());
    mayAnswer.set_value();
    completed.called.get_future().wait();
    EXPECT_EQ("pong", completed.body);
}

TEST(SendRequestAsync, LogsWhatTheCompletionThrows)
{
    std::promise<std::string> logged;
    Quillon::Service::GetApp()->GetLogFacility().SetSink(
        [&](const std::string& logger, int level, const std::string& text) {
            logged.set_value(logger + "[" + std::to_string(level) + "]: " + text);
        });
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(), [](const Exception*, ClientResponse*, PendingRequestItem*) {
            throw std::runtime_error("stray");
        });
    EXPECT_EQ(
        "Quillon[8]: The completion of an HTTP exchange raised an exception: stray",
        logged.get_future().get());
    Quillon::Service::GetApp()->GetLogFacility().SetSink({});
    EXPECT_EQ("pong", client.Post().body);
}

TEST(SendRequestAsync, RunsCompletionsWhereNoSignalGoes)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    std::promise<bool> blocked;
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(), [&](const Exception*, ClientResponse*, PendingRequestItem*) {
            blocked.set_value(NameLookup::AreSignalsBlocked());
        });
    EXPECT_TRUE(blocked.get_future().get());
    EXPECT_FALSE(NameLookup::AreSignalsBlocked());
}

TEST(SendRequestAsync, RunsTheExchangeWhereNoSignalGoes)
{
    // A write to a broken TLS connection raises SIGPIPE, and the thread that looks the name up
    // has the signal mask of the I/O thread that started it.
    NameLookup::Block block;
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec(NameLookup::BlockedHost, 80, false, spec);
    HttpClient stuck(spec);
    const Ref<PendingRequestItem> pending = stuck.Start(HttpClient::MakeRequest());
    EXPECT_TRUE(block.WaitUntilAsked().withoutSignals);
}

TEST(SendRequestAsync, LetsACompletionSendAndWait)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    std::promise<std::string> second;
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(), [&](const Exception*, ClientResponse*, PendingRequestItem*) {
            second.set_value(client.Post().body);
        });
    EXPECT_EQ("pong", second.get_future().get());
}

TEST(SendRequestAsync, LetsOtherExchangesRunWhileACompletionBlocks)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    std::promise<void> entered;
    std::promise<void> mayLeave;
    std::promise<void> left;
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(), [&](const Exception*, ClientResponse*, PendingRequestItem*) {
            entered.set_value();
            mayLeave.get_future().wait();
            left.set_value();
        });
    entered.get_future().wait();
    EXPECT_EQ("pong", client.Post().body);
    mayLeave.set_value();
    left.get_future().wait();
}

TEST(SendRequestAsync, RunsManyExchangesAtOnce)
{
    constexpr int Count = 64;
    std::latch allHere(Count);
    const TestServer server([&](ServerConnection& connection) {
        if (std::optional<ReceivedRequest> request = connection.ReadRequest()) {
            // Nobody is answered before everybody has asked.
            allHere.arrive_and_wait();
            connection.Write(MakeReply("200 OK", request->body));
        }
        connection.WaitForClose();
    });
    HttpClient client(server);
    std::vector<Ref<PendingRequestItem>> pending;
    for (int index = 0; index < Count; ++index) {
        pending.push_back(client.Start(HttpClient::MakeRequest(std::to_string(index))));
    }
    for (int index = 0; index < Count; ++index) {
        EXPECT_EQ(std::to_string(index), client.Wait(*pending[index]).body);
    }
    EXPECT_EQ(Count, server.GetConnectionCount());
}

TEST(SendRequestAsync, ServesManyThreads)
{
    const TestServer server([](ServerConnection& connection) {
        while (std::optional<ReceivedRequest> request = connection.ReadRequest()) {
            connection.Write(MakeReply("200 OK", request->body));
        }
    });
    const Ref<ConnectionSpec> spec = MakeTcpSpec(server);
    std::atomic<int> good{0};
    std::vector<std::thread> threads;
    for (int index = 0; index < 16; ++index) {
        threads.emplace_back([&, index] {
            for (int round = 0; round < 8; ++round) {
                const std::string body = std::to_string(index) + "/" + std::to_string(round);
                good += HttpClient(spec).Post(HttpClient::MakeRequest(body)).body == body ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(16 * 8, good);
}

/** A server that tells when a request has come and when its connection is gone. */
struct SilentServer
{
    std::promise<void> asked;
    std::promise<void> closed;
    TestServer server{[this](ServerConnection& connection) {
        connection.ReadRequest();
        asked.set_value();
        connection.WaitForClose();
        closed.set_value();
    }};
};

TEST(Cancel, EndsTheExchangeAndForgetsTheCompletion)
{
    SilentServer silent;
    HttpClient client(silent.server);
    const auto guard = std::make_shared<int>(0); // tells when the completion is gone
    std::atomic<bool> called{false};
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(),
        [guard, &called](const Exception*, ClientResponse*, PendingRequestItem*) {
            called = true;
        });
    silent.asked.get_future().wait();
    EXPECT_TRUE(pending->Cancel());
    EXPECT_EQ(1, guard.use_count());
    EXPECT_TRUE(HasHappened(silent.closed)) << "the I/O thread was not woken up";
    EXPECT_FALSE(called);
    EXPECT_TRUE(pending->Cancel());
}

TEST(Cancel, WakesTheIoThreadUp)
{
    std::promise<void> asked;
    std::promise<void> closed;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        connection.Write(MakeReply("200 OK", "pong"));
        connection.ReadRequest();
        asked.set_value();
        connection.WaitForClose();
        closed.set_value();
    });
    HttpClient client(server);
    client.Post();
    // Over a connection that is open already, so that no timer of a new one wakes the thread up.
    const Ref<PendingRequestItem> pending = client.Start(HttpClient::MakeRequest());
    asked.get_future().wait();
    EXPECT_TRUE(pending->Cancel());
    EXPECT_TRUE(HasHappened(closed)) << "the I/O thread was not woken up";
}

TEST(Cancel, EndsAWaitOfAnotherThread)
{
    SilentServer silent;
    HttpClient client(silent.server);
    const Ref<PendingRequestItem> pending = client.Start(HttpClient::MakeRequest());
    std::thread canceller([&] {
        silent.asked.get_future().wait();
        pending->Cancel();
    });
    EXPECT_THROW(client.Wait(*pending), HttpException);
    canceller.join();
}

TEST(Cancel, IsTooLateInsideTheCompletion)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    HttpClient client(server);
    std::promise<bool> cancelled;
    const Ref<PendingRequestItem> pending = client.Start(
        HttpClient::MakeRequest(),
        [&](const Exception*, ClientResponse*, PendingRequestItem* item) {
            cancelled.set_value(item->Cancel());
        });
    EXPECT_FALSE(cancelled.get_future().get());
}

TEST(Cancel, DoesNotWaitForANameLookup)
{
    const TestServer server(AnswerAll(MakeReply("200 OK", "pong")));
    NameLookup::Block block;
    Ref<ConnectionSpec> spec;
    CreateTCPConnectionSpec(NameLookup::BlockedHost, 80, false, spec);
    HttpClient stuck(spec);
    const Ref<PendingRequestItem> pending = stuck.Start(HttpClient::MakeRequest());
    block.WaitUntilAsked();
    EXPECT_TRUE(pending->Cancel());
    // The I/O thread is free at once, although the look-up still hangs.
    EXPECT_EQ("pong", HttpClient(server).Post().body);
}

TEST(PendingRequestItem, MayGoBeforeTheExchangeEnds)
{
    std::promise<void> asked;
    std::promise<void> mayAnswer;
    const TestServer server([&](ServerConnection& connection) {
        connection.ReadRequest();
        asked.set_value();
        mayAnswer.get_future().wait();
        connection.Write(MakeReply("200 OK", "pong"));
    });
    Completed completed;
    HttpClient(server).Start(HttpClient::MakeRequest(), completed.GetCompletion()).reset();
    asked.get_future().wait();
    mayAnswer.set_value();
    ASSERT_TRUE(HasHappened(completed.called));
    EXPECT_EQ("pong", completed.body);
    // Completions run one after another: a second call would come before that of a new exchange.
    const TestServer other(AnswerAndClose(""));
    Completed last;
    HttpClient(other).Start(HttpClient::MakeRequest(), last.GetCompletion());
    ASSERT_TRUE(HasHappened(last.called));
    EXPECT_EQ(1, completed.calls);
}

} // namespace
