// What SendWebapi asks of the tool and makes of its answer. The tools are real programs.
#include <gtest/gtest.h>
#include <tuvosharing/send_webapi.h>
#include <unistd.h>

#include <climits>
#include <new>
#include <string>
#include <vector>

#include "platform/failing_allocations.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "utils/tool.h"

namespace {

using TUVO::sharing::SendWebapi;
using tuvo_test::OpenLogNow;
using tuvo_test::SourceLine;
using tuvo_test::Tool;
using tuvo_test::ToolArguments;
using Texts = std::vector<std::string>;

constexpr char kSource[] = "utils/utils_send_webapi.cpp";

std::string Line(const std::string& name, const std::string& file, const std::string& text,
                 const std::string& end) {
  return "user.err " + name + ":" + std::to_string(SourceLine(file, text)) + " (" +
         std::to_string(getpid()) + ") " + text + end;
}

std::string NotReadLine() {
  return Line("utils_send_webapi", kSource, "json read failed", "\n\n");
}

// The guard's line first, then the function's own.
Texts NotStartedLines() {
  return {Line("include/internal/popen", "include/internal/popen.h", "TLIBCPopenv failed.", "\n"),
          Line("utils_send_webapi", kSource, "popen failed", "\n\n")};
}

class Webapi : public testing::Test {
 protected:
  bool Send(const Json::Value& params = Json::objectValue) {
    return SendWebapi(reply_, "TUVO.Sharing.Link", 1, "get", params);
  }

  Texts Logged() { return tuvo_test::TakeWritten(listener_); }

  tuvo_test::SyslogListener listener_;
  Tool tool_{"/usr/tuvo/bin/tuvowebapi"};
  Json::Value reply_ = "untouched";
};

const Json::Value kEmptyObject = Json::objectValue;

TEST_F(Webapi, TheReplyIsTheDocumentThatTheToolPrints) {
  tool_.Prints("{\"success\": true, \"data\": {\"total\": 3, \"links\": [1, null]}}\n");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["success"], Json::Value(true));
  EXPECT_EQ(reply_["data"]["total"], Json::Value(3));
  EXPECT_EQ(reply_["data"]["links"].size(), 2U);
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(Webapi, WithoutParametersTheToolIsGivenFourArgumentsBehindItsName) {
  tool_.Prints("{}");
  ASSERT_TRUE(Send());
  const Texts expected{"tuvowebapi", "--exec", "api=TUVO.Sharing.Link", "version=1", "method=get"};
  EXPECT_EQ(ToolArguments(), expected);
  ASSERT_TRUE(Send(Json::nullValue));
  EXPECT_EQ(ToolArguments(), expected);
}

TEST_F(Webapi, ParametersFollowSortedByName) {
  tool_.Prints("{}");
  Json::Value params;
  params["b"] = "2";
  params["a"] = "1";
  params["B"] = "3";
  params["aa"] = "4";
  params["10"] = "5";
  params["9"] = "6";
  ASSERT_TRUE(Send(params));
  Texts arguments = ToolArguments();
  ASSERT_EQ(arguments.size(), 11U);
  arguments.erase(arguments.begin(), arguments.begin() + 5);
  EXPECT_EQ(arguments, (Texts{"10=5", "9=6", "B=3", "a=1", "aa=4", "b=2"}));
}

TEST_F(Webapi, ValuesAreGivenRaw) {
  tool_.Prints("{}");
  const std::string odd = " a  b\n'\"`id`$HOME;*\\=x=\t\xc3\xbc\xff&";
  Json::Value params;
  params["p"] = odd;
  params["n=a m'e"] = "";
  ASSERT_TRUE(SendWebapi(reply_, odd, 2, odd, params));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvowebapi", "--exec", "api=" + odd, "version=2",
                                    "method=" + odd, "n=a m'e=", "p=" + odd}));
}

TEST_F(Webapi, NumbersBooleansAndNullHaveTheirTexts) {
  tool_.Prints("{}");
  Json::Value params;
  params["a"] = -7;
  params["b"] = 4294967295U;
  params["c"] = true;
  params["d"] = false;
  params["e"] = Json::nullValue;
  params["f"] = Json::Value::minLargestInt;
  params["g"] = 0.5;
  ASSERT_TRUE(Send(params));
  Texts arguments = ToolArguments();
  ASSERT_EQ(arguments.size(), 12U);
  arguments.erase(arguments.begin(), arguments.begin() + 5);
  EXPECT_EQ(arguments, (Texts{"a=-7", "b=4294967295", "c=true", "d=false",
                              "e=", "f=-9223372036854775808", "g=0.5"}));
}

TEST_F(Webapi, TheVersionIsDecimalWithAMinusSign) {
  tool_.Prints("{}");
  for (const int version : {0, -1, INT_MAX, INT_MIN}) {
    ASSERT_TRUE(SendWebapi(reply_, "A", version, "m", kEmptyObject));
    EXPECT_EQ(ToolArguments().at(3), "version=" + std::to_string(version));
  }
}

TEST_F(Webapi, EmptyNamesAreArgumentsToo) {
  tool_.Prints("{}");
  Json::Value params;
  params[""] = "x";
  ASSERT_TRUE(SendWebapi(reply_, "", 1, "", params));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvowebapi", "--exec", "api=", "version=1", "method=", "=x"}));
}

TEST_F(Webapi, AnArgumentEndsAtItsFirstNulByte) {
  tool_.Prints("{}");
  Json::Value params;
  params["p"] = std::string("a\0b", 3);
  ASSERT_TRUE(Send(params));
  EXPECT_EQ(ToolArguments().back(), "p=a");
}

TEST_F(Webapi, AMemberThatIsAnObjectOrAListRaisesTheJsonLibrarysError) {
  tool_.Prints("{}");
  for (const Json::ValueType type : {Json::objectValue, Json::arrayValue}) {
    Json::Value params;
    params["a"] = 1;
    params["b"] = Json::Value(type);
    reply_ = "untouched";
    EXPECT_THROW(Send(params), Json::LogicError);
    EXPECT_EQ(reply_, kEmptyObject);
    EXPECT_EQ(ToolArguments(), Texts{}) << "nothing was started";
    EXPECT_FALSE(tuvo_test::HasChildren());
    EXPECT_EQ(Logged(), Texts{});
  }
}

TEST_F(Webapi, ParametersThatAreNoObjectRaiseTheJsonLibrarysError) {
  tool_.Prints("{}");
  EXPECT_THROW(Send(Json::arrayValue), Json::LogicError);
  EXPECT_THROW(Send("a=b"), Json::LogicError);
  EXPECT_EQ(ToolArguments(), Texts{});
}

TEST_F(Webapi, TheReplyBecomesAnEmptyObjectFirst) {
  reply_ = Json::Value(Json::arrayValue);
  reply_.append("of an earlier request");
  EXPECT_FALSE(Send());
  EXPECT_EQ(reply_, kEmptyObject);
}

TEST_F(Webapi, NothingOfAnEarlierReplyIsLeft) {
  tool_.Prints("{\"b\": 2}");
  reply_ = Json::Value(Json::objectValue);
  reply_["a"] = 1;
  ASSERT_TRUE(Send());
  EXPECT_EQ(reply_.getMemberNames(), Texts{"b"});
}

TEST_F(Webapi, TheReplyMayBeTheParameters) {
  tool_.Prints("{\"b\": 2}");
  reply_ = Json::Value(Json::objectValue);
  reply_["a"] = "1";
  reply_["c"] = "3";
  ASSERT_TRUE(Send(reply_));
  Texts arguments = ToolArguments();
  ASSERT_EQ(arguments.size(), 7U);
  EXPECT_EQ(Texts(arguments.begin() + 5, arguments.end()), (Texts{"a=1", "c=3"}));
  EXPECT_EQ(reply_.getMemberNames(), Texts{"b"});
}

TEST_F(Webapi, TheParametersMayBeAPartOfTheReply) {
  tool_.Prints("{\"b\": 2}");
  const std::string text(100, 'x');  // one that lies on the heap
  reply_ = Json::Value(Json::objectValue);
  reply_["data"]["links"][0]["a"] = text;
  ASSERT_TRUE(Send(reply_["data"]["links"][0]));
  EXPECT_EQ(ToolArguments().back(), "a=" + text);
  EXPECT_EQ(reply_.getMemberNames(), Texts{"b"});
}

TEST_F(Webapi, WithoutAToolItFails) {
  EXPECT_FALSE(Send());
  EXPECT_EQ(reply_, kEmptyObject);
  EXPECT_EQ(Logged(), NotStartedLines());
}

TEST_F(Webapi, AToolThatMayNotBeRunIsNoTool) {
  tool_.Runs("echo '{}'");
  std::filesystem::permissions(tool_.path(), static_cast<std::filesystem::perms>(0644));
  EXPECT_FALSE(Send());
  EXPECT_EQ(Logged(), NotStartedLines());
}

TEST_F(Webapi, ArgumentsTooLongForTheSystemAreAFailure) {
  tool_.Prints("{}");
  Json::Value params;
  params["p"] = std::string(size_t{4} << 20, 'x');
  EXPECT_FALSE(Send(params));
  EXPECT_EQ(Logged(), NotStartedLines());
}

class WebapiOutput : public Webapi, public testing::WithParamInterface<std::string> {};

TEST_P(WebapiOutput, ThatIsNoDocumentIsAFailure) {
  tool_.Prints(GetParam());
  EXPECT_FALSE(Send());
  EXPECT_EQ(Logged(), Texts{NotReadLine()});
}

INSTANTIATE_TEST_SUITE_P(Texts, WebapiOutput,
                         testing::Values("", "\n", "no JSON", "{", "{\"a\": 1", "{\"a\": 1,}",
                                         "[1,]", "'a'", "NaN", "\xef\xbb\xbf{}", "/* open",
                                         std::string("\0{}", 3)));

TEST_F(Webapi, ADocumentNeedNotBeAnObject) {
  tool_.Prints("[1, 2]");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_.size(), 2U);
  tool_.Prints("\"text\"");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_, Json::Value("text"));
  tool_.Prints("null");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_, Json::Value());
}

TEST_F(Webapi, WhatStandsBehindTheDocumentDoesNotCount) {
  tool_.Prints("{\"a\": 1} and more");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["a"], Json::Value(1));
}

TEST_F(Webapi, CommentsAreSkippedAndNotCollected) {
  tool_.Prints("/* before */ {\"a\": 1} // behind\n");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["a"], Json::Value(1));
  for (const Json::CommentPlacement place :
       {Json::commentBefore, Json::commentAfterOnSameLine, Json::commentAfter}) {
    EXPECT_FALSE(reply_.hasComment(place));
  }
}

TEST_F(Webapi, TextsMayHoldAnyByte) {
  tool_.Prints("{\"a\": \"\\u0000\xc3\xbc\xff\", \"\\u0000\": 1}");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["a"].asString(), std::string("\0\xc3\xbc\xff", 4));
}

TEST_F(Webapi, ANulByteInTheOutputDoesNotEndIt) {
  tool_.Prints(std::string("{\"a\": \"x\0y\"}", 12));
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["a"].asString(), std::string("x\0y", 3));
}

// Sizes around the pieces in which the output is read, around a pipe's, and far beyond.
TEST_F(Webapi, OutputOfAnySizeIsReadWhole) {
  for (const size_t size : {4095U, 4096U, 4097U, 8192U, 65536U, 65537U, 3000000U}) {
    const std::string text(size - 8, 'x');
    tool_.Prints("{\"a\":\"" + text + "\"}");
    ASSERT_TRUE(Send()) << size;
    EXPECT_TRUE(reply_["a"].asString() == text) << size;
  }
}

TEST_F(Webapi, OutputThatComesInPiecesIsReadWhole) {
  tool_.Runs("printf '{\"a\":'; sleep 0.2; printf ' 12'; sleep 0.2; echo 3}");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["a"], Json::Value(123));
}

TEST_F(Webapi, AsManyLevelsAsTheJsonLibraryReadsAreRead) {
  tool_.Prints(std::string(900, '[') + std::string(900, ']'));
  EXPECT_TRUE(Send());
}

TEST_F(Webapi, ADocumentNestedTooDeeplyIsAFailureAndRaisesNothing) {
  tool_.Prints(std::string(100000, '['));
  EXPECT_FALSE(Send());
  EXPECT_EQ(Logged(), Texts{NotReadLine()});
}

TEST_F(Webapi, AToolThatFailsAtOnceHasNoAnswer) {
  tool_.Runs("exit 3");
  EXPECT_FALSE(Send());
  EXPECT_EQ(Logged(), Texts{NotReadLine()});
}

TEST_F(Webapi, AToolThatASignalEndsHasOnlySaidWhatItSaid) {
  tool_.Runs("printf '{\"a\": 1'; kill -KILL $$");
  EXPECT_FALSE(Send());
  EXPECT_EQ(Logged(), Texts{NotReadLine()});
}

TEST_F(Webapi, TheExitStatusDoesNotCount) {
  tool_.Runs("echo '{\"success\": false}'; exit 1");
  EXPECT_TRUE(Send());
  EXPECT_EQ(reply_["success"], Json::Value(false));
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(Webapi, TheToolHasEndedWhenTheAnswerIsThere) {
  tool_.Runs("echo '{}'; exec >&-; sleep 0.3; : >/tmp/tool-ended");
  std::filesystem::remove("/tmp/tool-ended");
  EXPECT_TRUE(Send());
  EXPECT_TRUE(std::filesystem::exists("/tmp/tool-ended"));
}

TEST_F(Webapi, NoExitLeavesAChildOrADescriptor) {
  OpenLogNow();
  const size_t before = tuvo_test::OpenDescriptors();
  for (const char* script : {"echo '{}'", "echo no", "exit 3", "kill -KILL $$"}) {
    tool_.Runs(script);
    Send();
    EXPECT_FALSE(tuvo_test::HasChildren()) << script;
    EXPECT_EQ(tuvo_test::OpenDescriptors(), before) << script;
  }
  std::filesystem::remove(tool_.path());
  Send();
  EXPECT_FALSE(tuvo_test::HasChildren());
  EXPECT_EQ(tuvo_test::OpenDescriptors(), before);
}

// Each allocation fails in turn; some of that is raised while the tool runs. Nobody listens to the
// log here: a listener is a thread, and it would be its allocations that fail.
TEST(WebapiWithoutMemory, WhatIsRaisedLeavesNoChildAndNoDescriptorEither) {
  Tool tool("/usr/tuvo/bin/tuvowebapi");
  Json::Value reply;
  tool.Prints("{\"a\": [" + std::string(20000, ' ') + "\"text of more than fifteen bytes\"]}");
  const Json::Value params = kEmptyObject;
  const std::string name = "a name of more than fifteen bytes";
  const size_t before = tuvo_test::OpenDescriptors();
  int raised_while_it_ran = 0;
  bool done = false;
  for (long allowed = 0; !done && allowed < 1000; ++allowed) {
    std::filesystem::remove("/tmp/tool-arguments");
    bool raised = false;
    tuvo_test::allocations_left = allowed;
    try {
      done = SendWebapi(reply, name, 1, name, params);
    } catch (const std::bad_alloc&) {
      raised = true;
    }
    done = done && tuvo_test::allocations_left >= 0;
    tuvo_test::allocations_left = -1;
    raised_while_it_ran += raised && !ToolArguments().empty() ? 1 : 0;
    ASSERT_FALSE(tuvo_test::HasChildren()) << "allocation " << allowed;
    ASSERT_EQ(tuvo_test::OpenDescriptors(), before) << "allocation " << allowed;
  }
  EXPECT_TRUE(done);
  EXPECT_GT(raised_while_it_ran, 0);
}

// Its first member is there before the others find no memory.
TEST(WebapiWithoutMemory, AReplyThatDoesNotFitIsNotTakenForOneThatCannotBeRead) {
  Tool tool("/usr/tuvo/bin/tuvowebapi");
  tool.Prints("{\"first\": 1, \"second\": [1, 2, 3, 4, 5, 6, 7, 8, 9, 10]}");
  const Json::Value params = kEmptyObject;
  int raised_while_reading = 0;
  bool done = false;
  for (long allowed = 0; !done && allowed < 1000; ++allowed) {
    Json::Value reply;
    tuvo_test::allocations_left = allowed;
    try {
      done = SendWebapi(reply, "A", 1, "m", params);
      const bool refused = tuvo_test::allocations_left < 0;
      tuvo_test::allocations_left = -1;
      EXPECT_TRUE(done || !reply.isMember("first")) << "allocation " << allowed;
      done = done && !refused;
    } catch (const std::bad_alloc&) {
      tuvo_test::allocations_left = -1;
      raised_while_reading += reply.isMember("first") ? 1 : 0;
    }
  }
  EXPECT_TRUE(done);
  EXPECT_GT(raised_while_reading, 0);
}

}  // namespace
