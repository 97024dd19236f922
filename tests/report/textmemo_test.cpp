// Texts that are looked up are what they would be recognised as; and eight bytes at a time.

#include "textmemo.h"

#include <set>
#include <string>

#include <gtest/gtest.h>

using namespace report;

namespace {

const recogniser& known()
{
    return recogniser::ofall();
}

// The form with its values replaced: those that have to be numbers, by a number.
std::string filled(const messageform& form, const std::string& name, int number)
{
    static const std::set<std::string> texts = {"{NAME}",   "{PATH}",   "{DEPENDENT}", "{START}",
                                                "{STOP}",   "{CHECK}",  "{FORMAT}",    "{LINE}",
                                                "{ANSWER}", "{COMMAND}"};
    std::string text(form.text);
    for (std::size_t place = text.find('{'); place != std::string::npos; place = text.find('{')) {
        const std::size_t size = text.find('}') - place + 1;
        const bool istext = texts.contains(text.substr(place, size));
        text.replace(place, size, istext ? name : std::to_string(number));
    }
    return text;
}

TEST(TextMemo, GivesWhatWasRecognised)
{
    textmemo memo;
    for (int service = 0; service < 300; ++service) {
        const std::string name = "service" + std::to_string(service);
        for (const messageform& form : messageforms()) {
            const std::string text = filled(form, name, service);
            const speakerid who = known().speakerof(form.level, form.module);
            const auto found = known().find(who, text);
            ASSERT_NE(found.form, nullptr) << text;
            memo.keep(who, text, found);
            const std::string same(text.begin(),
                                   text.end()); // the values are parts of what is asked for
            const auto* const kept = memo.find(who, same);
            if (text.size() < textmemo::kLeastBytes || text.size() > textmemo::kMostBytes) {
                EXPECT_EQ(kept, nullptr);
                continue;
            }
            ASSERT_NE(kept, nullptr) << text;
            const auto again = kept->in(same);
            EXPECT_EQ(again.form, found.form);
            EXPECT_EQ(again.what.first, found.what.first);
            EXPECT_EQ(again.what.second, found.what.second);
            EXPECT_TRUE(again.what.first.empty() ||
                        (again.what.first.data() >= same.data() &&
                         again.what.first.data() < same.data() + same.size()));
            EXPECT_EQ(memo.find(who == 0 ? 1 : 0, same), nullptr);
        }
    }
}

TEST(TextMemo, AnyOtherByteIsAnotherText)
{
    textmemo memo;
    const speakerid who = known().speakerof(loglevel::kError, "wdmonitorthread");
    for (std::size_t size = textmemo::kLeastBytes; size <= textmemo::kMostBytes; ++size) {
        std::string text = "Try the general recover for service ";
        text.resize(size, 'x');
        // Shorter than the message, it could be any other's: that is not looked at.
        const recogniser::found any = known().find(who, "Try the general recover for service ");
        memo.keep(who, text, {any.form, {}});
        ASSERT_NE(memo.find(who, text), nullptr) << size;
        for (std::size_t place = 0; place < size; ++place) {
            text[place] = static_cast<char>(text[place] ^ 1);
            EXPECT_EQ(memo.find(who, text), nullptr) << size << " " << place;
            text[place] = static_cast<char>(text[place] ^ 1);
        }
    }
}

TEST(Bytes, DigitsAreCountedAndRead)
{
    for (std::size_t digits = 0; digits <= kWordBytes; ++digits) {
        for (int other = 0; other < 256; ++other) {
            std::string text = std::string("98765432").substr(0, digits);
            text.resize(kWordBytes, static_cast<char>(other));
            const bool isdigit = other >= '0' && other <= '9';
            EXPECT_EQ(digitsin(wordat(text.data())), isdigit ? kWordBytes : digits) << other;
            if (digits > 0) {
                EXPECT_EQ(numberin(wordat(text.data()), digits),
                          std::stoull(text.substr(0, digits)));
            }
        }
    }
    EXPECT_EQ(numberin(wordat("00000000"), 8), 0U);
    EXPECT_EQ(numberin(wordat("99999999"), 8), 99999999U);
}

TEST(Bytes, BehindTheEndAreZeros)
{
    EXPECT_EQ(wordof("abc", 0), 0x636261U);
    EXPECT_EQ(wordof("abc", 2), 0x63U);
    EXPECT_EQ(wordof("abc", 3), 0U);
    EXPECT_EQ(wordof("abc", 9), 0U);
    EXPECT_EQ(wordof("01234567", 0), wordat("01234567"));
}

} // namespace
