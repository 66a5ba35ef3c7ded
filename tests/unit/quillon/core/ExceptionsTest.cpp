#include "quillon/Exceptions.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <stdexcept>

using namespace Quillon;

namespace {

class OuterException : public ExceptionOf<OuterException, Exception>
{
public:
    using ExceptionOf::ExceptionOf;
};

class InnerException : public ExceptionOf<InnerException, OuterException>
{
public:
    using ExceptionOf::ExceptionOf;
};

} // namespace

TEST(Exception, KeepsItsMessage)
{
    EXPECT_STREQ("some text", InvalidStateException("some text").what());
}

TEST(Exception, CopyKeepsItsMessage)
{
    const auto original = std::make_unique<InvalidStateException>("some text");
    EXPECT_STREQ("some text", InvalidStateException(*original).what());
}

TEST(InvalidArgumentException, BeginsWithItsPrefix)
{
    EXPECT_STREQ("Invalid argument : no name", InvalidArgumentException("no name").what());
}

TEST(Clone, KeepsDynamicTypeAndMessage)
{
    const InnerException error("deep");
    const Exception& base = error;
    const std::unique_ptr<Exception> copy(base.Clone());
    const Exception& cloned = *copy;
    EXPECT_EQ(typeid(InnerException), typeid(cloned));
    EXPECT_STREQ("deep", copy->what());
    EXPECT_NE(&base, copy.get());
}

TEST(Clone, KeepsThePrefixOfAnArgumentErrorOnce)
{
    const std::unique_ptr<Exception> copy(InvalidArgumentException("x").Clone());
    const Exception& cloned = *copy;
    EXPECT_EQ(typeid(InvalidArgumentException), typeid(cloned));
    EXPECT_STREQ("Invalid argument : x", copy->what());
}

TEST(Throw, KeepsDynamicType)
{
    const InnerException error("deep");
    const Exception& base = error;
    EXPECT_THROW(base.Throw(), InnerException);
}

TEST(Throw, ArrivesAsTheClassInBetween)
{
    try {
        InnerException("deep").Throw();
        FAIL() << "Throw returned";
    } catch (const OuterException& error) {
        EXPECT_EQ("InnerException", GetClassName(error));
        EXPECT_STREQ("deep", error.what());
    }
}

TEST(GetClassName, LeavesOutTheNamespace)
{
    EXPECT_EQ("InvalidStateException", GetClassName(InvalidStateException("x")));
    EXPECT_EQ("Base64FormatException", GetClassName(Base64FormatException("x")));
}

TEST(GetClassName, WorksForAnAnonymousNamespace)
{
    EXPECT_EQ("OuterException", GetClassName(OuterException("x")));
}

TEST(GetClassName, WorksForTheStandardLibrary)
{
    EXPECT_EQ("out_of_range", GetClassName(std::out_of_range("x")));
}

TEST(Dump, HoldsClassMessageAndCallStack)
{
    const InvalidStateException error("some text");
    EXPECT_EQ("InvalidStateException: some text\n" + error.GetBacktrace(), error.Dump());
}

TEST(GetBacktrace, HasALineForEachFrame)
{
    const std::string text = InvalidStateException("x").GetBacktrace();
    EXPECT_NE(std::string::npos, text.find("quillon_core_tests+0x"));
    EXPECT_GT(std::count(text.begin(), text.end(), '\n'), 3);
    EXPECT_EQ('\n', text.back());
}

TEST(Where, IsAFrameOutsideTheLibrary)
{
    const InvalidArgumentException error("x");
    const std::string where = error.Where();
    EXPECT_NE(std::string::npos, error.GetBacktrace().find(where + "\n"));
    EXPECT_EQ(std::string::npos, where.find("libquillon")) << where;
}

TEST(ThrowTypeMismatchException, NamesBothKinds)
{
    try {
        ThrowTypeMismatchException("Document", "null");
        FAIL() << "returned";
    } catch (const TypeMismatchException& error) {
        EXPECT_STREQ("Type mismatch: expected Document, found null", error.what());
    }
}
