// The table of messages, and recognising them: each form with values that could be taken for
// something else.

#include "message.h"

#include <array>
#include <set>
#include <string>

#include <gtest/gtest.h>

#include "recogniser.h"

using namespace report;

namespace {

constexpr std::string_view kMonitor = "wdmonitorthread";

// The form with its values replaced: numbers by a number, anything else by `value`.
std::string filled(const messageform& form, const std::string& value)
{
    static const std::set<std::string_view> numbers = {"N",   "SECONDS", "STATUS", "PID",
                                                       "OLD", "NEW",     "TID",    "LIMIT"};
    std::string text;
    for (std::string_view rest = form.text; !rest.empty();) {
        const std::size_t open = rest.find('{');
        text.append(rest.substr(0, open));
        if (open == std::string_view::npos) {
            break;
        }
        const std::size_t close = rest.find('}');
        text.append(numbers.contains(rest.substr(open + 1, close - open - 1)) ? "-12" : value);
        rest.remove_prefix(close + 1);
    }
    return text;
}

messageid idof(loglevel level, std::string_view text)
{
    return recognise(level, kMonitor, text).id;
}

TEST(Recognise, KnowsEachFormWhateverItsValuesHold)
{
    for (const messageform& form : messageforms()) {
        for (const char* value :
             {"web", "", "{", "web. Try", ", unrecognized service", ") Executing functional ping",
              "Try the general recover for service ", "x, result = y, state = 0", "12", "a\nb",
              "General ping successful!", "(web) Skipping functional ping. 3 FPs skipped so far"}) {
            const std::string text = filled(form, value);
            EXPECT_EQ(recognise(form.level, form.module, text).id, form.id) << text;
        }
    }
}

TEST(Recognise, GivesTheValues)
{
    const auto failed = recognise(loglevel::kError, kMonitor,
                                  "General ping failed for service a, unrecognized service.. Try "
                                  "to general ping more times now, if failed 3 times, will "
                                  "generally recover this service.");
    EXPECT_EQ(failed.id, messageid::kServiceFailed);
    EXPECT_EQ(failed.first, "a, unrecognized service.");
    EXPECT_EQ(failed.second, "");

    const auto skipped = recognise(loglevel::kInfo, kMonitor,
                                   "(/b) Skipping functional ping. 1 FPs) Skipping functional "
                                   "ping. 27 FPs skipped so far.");
    EXPECT_EQ(skipped.id, messageid::kCheckSkipped);
    EXPECT_EQ(skipped.first, "/b) Skipping functional ping. 1 FPs");
    EXPECT_EQ(skipped.second, "27");

    const auto answered = recognise(loglevel::kDebug, kMonitor,
                                    "command = c, result = running, state = 1, state = -1");
    EXPECT_EQ(answered.id, messageid::kStatusAnswered);
    EXPECT_EQ(answered.first, "c");
    EXPECT_EQ(answered.second, "running, state = 1");

    const auto stop =
        recognise(loglevel::kDebug, kMonitor, "User provided stop command dep: kill phpphp");
    EXPECT_EQ(stop.first, "kill phpphp");

    const auto changed = recognise(loglevel::kDebug, "ProcessStatistics",
                                   "(/usr/bin/a b) PID changed (old = -1, new = 77)");
    EXPECT_EQ(changed.first, "/usr/bin/a b");
    EXPECT_EQ(changed.second, "-1");

    const auto check = recognise(loglevel::kDebug, kMonitor,
                                 "Performing functional ping, process id is: 12, fp cmd is: echo, "
                                 "fp cmd is: 3");
    EXPECT_EQ(check.first, "12");
    EXPECT_EQ(check.second, "echo, fp cmd is: 3");

    const auto listed = recognise(loglevel::kDebug, "wdxmlparserhandler ", "");
    EXPECT_EQ(listed.id, messageid::kListing);
}

TEST(Recognise, TakesNothingElse)
{
    EXPECT_EQ(idof(loglevel::kDebug, "General ping successful"), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "General ping successful! "), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "General ping successful! state = x"), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "General ping successful! state = "), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "General ping successful! state = -"), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "command = c, result = , state = "), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, "command = c, state = 0"), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, ""), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kDebug, std::string("\0", 1)), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kInfo, "(a) Skipping functional ping.  FPs skipped so far."),
              messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kInfo, "() Executing functional ping now ..."), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kInfo, "General ping successful!"), messageid::kForeign); // its level
    EXPECT_EQ(recognise(loglevel::kError, "wdmanager ", "Loadservices error.").id,
              messageid::kForeign);
    EXPECT_EQ(recognise(loglevel::kError, "nobody", "Loadservices error.").id, messageid::kForeign);
    EXPECT_EQ(recognise(loglevel::kStandardError, "", "Unable to open the log file!").id,
              messageid::kForeign);
}

TEST(Recognise, APrefixAndAnEndDoNotOverlap)
{
    EXPECT_EQ(idof(loglevel::kDebug, "Thread id :1thread created..."), messageid::kThreadCreated);
    EXPECT_EQ(idof(loglevel::kDebug, "Thread id :thread created..."), messageid::kForeign);
    EXPECT_EQ(idof(loglevel::kInfo, "() Can not skip Functional ping now, max skip count reached"),
              messageid::kCannotSkip);
    EXPECT_EQ(idof(loglevel::kInfo, ") Can not skip Functional ping now, max skip count reached"),
              messageid::kForeign);
}

TEST(MessageForms, TellWhatTheyMean)
{
    std::set<messageid> ids;
    for (const messageform& form : messageforms()) {
        ids.insert(form.id);
        EXPECT_FALSE(form.meaning.empty()) << form.text;
        EXPECT_EQ(form.module.empty(), form.level == loglevel::kStandardError) << form.text;
    }
    EXPECT_EQ(ids.size(), static_cast<std::size_t>(messageid::kForeign)); // each but this
    EXPECT_FALSE(ids.contains(messageid::kForeign));
}

TEST(Matters, WhatStandsInALogWithoutDebugLinesDoes)
{
    // What such a log has besides says nothing new about a state.
    const std::set<messageid> silent = {messageid::kNotConfigured};
    for (const messageform& form : messageforms()) {
        if (form.level != loglevel::kDebug) {
            EXPECT_EQ(matters(form.id), !silent.contains(form.id)) << form.text;
        }
    }
    EXPECT_FALSE(matters(messageid::kForeign));
}

class Fragments : public ::testing::Test {
protected:
    const recogniser& known = recogniser::ofall();

    [[nodiscard]] fragment of(loglevel level, std::string_view text) const
    {
        return known.fragmentof(known.speakerof(level, kMonitor), text);
    }
};

TEST_F(Fragments, EachBeginningOfAMessageIsOne)
{
    for (const messageform& form : messageforms()) {
        const speakerid who = known.speakerof(form.level, form.module);
        const std::string text = filled(form, "web");
        for (std::size_t size = 0; size < text.size(); ++size) {
            const std::string begin = text.substr(0, size);
            if (known.find(who, begin).form == nullptr) {
                EXPECT_NE(known.fragmentof(who, begin), fragment::kNone) << begin;
            }
        }
    }
}

TEST_F(Fragments, MayFollowWhereAValueMayHoldALineBreak)
{
    EXPECT_EQ(of(loglevel::kError, "General ping failed for service we"), fragment::kMayFollow);
    EXPECT_EQ(of(loglevel::kInfo, "(/usr/bin/we"), fragment::kMayFollow);
    EXPECT_EQ(of(loglevel::kDebug, "command = service a"), fragment::kMayFollow);
    EXPECT_EQ(of(loglevel::kDebug, "Functional ping failed with return 3: a"), fragment::kCut);
    EXPECT_EQ(of(loglevel::kDebug, "Thread id :12"), fragment::kCut);
    EXPECT_EQ(of(loglevel::kDebug, "General ping succ"), fragment::kCut);
    EXPECT_EQ(of(loglevel::kDebug, "Something else"), fragment::kNone);
    EXPECT_EQ(of(loglevel::kDebug, "General ping successful!!"), fragment::kNone);
}

TEST_F(Fragments, KnowsTheEndOfAMessage)
{
    EXPECT_TRUE(known.endsmessage("ping successful!"));
    EXPECT_TRUE(known.endsmessage("web, unrecognized service."));
    EXPECT_FALSE(known.endsmessage("web"));
    EXPECT_FALSE(known.endsmessage(""));
}

} // namespace
