#include "ssoClient/Exceptions.h"

#include <gtest/gtest.h>

#include <memory>
#include <type_traits>

using namespace SsoClient;

template <class Error>
class ExceptionFamily : public testing::Test
{};

using Family = testing::Types<
    SsoException,
    InvalidTokenException,
    ParseException,
    InvalidSignatureException,
    CommunicationException,
    InvalidCredentialsException>;
TYPED_TEST_SUITE(ExceptionFamily, Family);

TYPED_TEST(ExceptionFamily, CloneKeepsTypeAndText)
{
    const TypeParam error("some text");
    const Quillon::Exception& base = error;
    const std::unique_ptr<Quillon::Exception> copy(base.Clone());
    const Quillon::Exception& cloned = *copy;
    EXPECT_EQ(typeid(TypeParam), typeid(cloned));
    EXPECT_STREQ("some text", cloned.what());
}

TYPED_TEST(ExceptionFamily, CloneKeepsTheStack)
{
    const TypeParam error("some text");
    const std::string stack = error.GetBacktrace();
    EXPECT_NE("", stack);
    const std::unique_ptr<Quillon::Exception> copy(error.Clone());
    EXPECT_EQ(stack, copy->GetBacktrace());
}

TYPED_TEST(ExceptionFamily, ThrowKeepsType)
{
    const TypeParam error("some text");
    const Quillon::Exception& base = error;
    try {
        base.Throw();
    } catch (const Quillon::Exception& thrown) {
        EXPECT_EQ(typeid(TypeParam), typeid(thrown));
        EXPECT_STREQ("some text", thrown.what());
    }
}

TEST(ParseException, CaughtAsTokenErrorIsThrownAgainAsItself)
{
    try {
        throw ParseException("bad shape");
    } catch (const InvalidTokenException& error) {
        EXPECT_THROW(error.Throw(), ParseException);
    }
}

TEST(ExceptionFamilyTree, HasItsBases)
{
    EXPECT_TRUE((std::is_base_of_v<Quillon::Exception, SsoException>));
    EXPECT_TRUE((std::is_base_of_v<SsoException, InvalidTokenException>));
    EXPECT_TRUE((std::is_base_of_v<InvalidTokenException, ParseException>));
    EXPECT_TRUE((std::is_base_of_v<InvalidTokenException, InvalidSignatureException>));
    EXPECT_TRUE((std::is_base_of_v<SsoException, CommunicationException>));
    EXPECT_TRUE((std::is_base_of_v<SsoException, InvalidCredentialsException>));
    EXPECT_FALSE((std::is_base_of_v<InvalidTokenException, InvalidCredentialsException>));
    EXPECT_FALSE((std::is_base_of_v<InvalidTokenException, CommunicationException>));
}
