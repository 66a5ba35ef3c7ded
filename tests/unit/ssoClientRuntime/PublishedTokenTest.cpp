#include "ssoClientRuntime/PublishedToken.h"

#include "support/FakeSamlToken.h"

#include <boost/smart_ptr/make_shared.hpp>
#include <boost/smart_ptr/weak_ptr.hpp>
#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

using namespace SsoClient;

namespace {

boost::shared_ptr<FakeSamlToken> MakeToken(int number)
{
    auto token = boost::make_shared<FakeSamlToken>();
    token->id = std::to_string(number);
    return token;
}

TEST(PublishedToken, HasNoneAtFirst)
{
    const PublishedToken published;
    EXPECT_EQ(nullptr, published.Read({}));
}

TEST(PublishedToken, GivesTheTokenWhileItsLeaseLasts)
{
    PublishedToken published;
    const auto token = MakeToken(1);
    published.Publish(token, {Span(10), Span(20)});
    EXPECT_EQ(token, published.Read({Span(10), Span(20)}));
    EXPECT_EQ(nullptr, published.Read({Span(11), Span(20)}));
    EXPECT_EQ(nullptr, published.Read({Span(10), Span(21)}));
}

TEST(PublishedToken, KeepsNoTokenThatWasReplaced)
{
    PublishedToken published;
    const boost::weak_ptr<FakeSamlToken> first = [&] {
        const auto token = MakeToken(1);
        published.Publish(token, {Span(10), Span(10)});
        return token;
    }();
    EXPECT_FALSE(first.expired());
    published.Publish(MakeToken(2), {Span(10), Span(10)});
    EXPECT_TRUE(first.expired());
}

// What a reader gets is a whole token and its own lease, whenever the writer comes.
TEST(PublishedToken, IsReadWhileItIsReplaced)
{
    constexpr int Count = 2'000;
    PublishedToken published;
    published.Publish(MakeToken(1), {Span(1), Span(1)});
    std::atomic<bool> isOver{false};
    std::atomic<int> mistakes{0};
    std::vector<std::thread> readers;
    for (int reader = 0; reader < 3; ++reader) {
        readers.emplace_back([&] {
            int last = 0;
            while (!isOver) {
                const auto token = published.Read({Span(1), Span(1)});
                const int number = token ? std::stoi(token->GetId()) : -1;
                mistakes += number < last ? 1 : 0;
                last = number;
            }
        });
    }
    for (int number = 2; number <= Count; ++number) {
        published.Publish(MakeToken(number), {Span(1), Span(1)});
    }
    isOver = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_EQ(0, mistakes);
}

} // namespace
