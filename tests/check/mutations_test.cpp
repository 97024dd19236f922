// MUTATIONS mistakes in the sample configuration, the same at each run: what the daemon's reader
// makes of a file is what the checker says, and whatever it makes otherwise than it stands there is
// found.

#include <array>
#include <cctype>
#include <fstream>
#include <functional>
#include <iostream>
#include <iterator>
#include <map>
#include <random>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <unistd.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "daemonview.h"
#include "finding.h"
#include "json.h"
#include "shape.h"
#include "sourcetext.h"
#include "values.h"
#include "wdLocalLog_linux.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

using Record = std::map<std::string, std::string>;
using Target = std::vector<Record>; // the monitored service first

struct Reading {
    bool loaded = false;
    std::vector<Target> targets;

    bool operator==(const Reading&) const = default;
};

// --- what the daemon reads

Record recordof(const service& svc)
{
    Record record;
    for (const fieldelement& field : kFieldElements) {
        record[std::string(field.name)] = svc.*field.field;
    }
    return record;
}

std::string mutatedfile()
{
    return ::testing::TempDir() + "mutated." + std::to_string(getpid());
}

// As a daemon does that has just started.
Reading readbydaemon(const std::string& text)
{
    const std::string path = mutatedfile();
    std::ofstream(path, std::ios::binary) << text;
    xercecstack = {};
    charparse.clear();
    monitorservice = {};
    monservicedep = {};
    monservicedepends.clear();
    Reading reading;
    try {
        xmlparser::parse(path);
        reading.loaded = true;
    } catch (const std::out_of_range&) {
        return reading;
    }
    for (const wdmonitortarget& each : xmlparser::alltargets) {
        Target target{recordof(each.monitoredservice)};
        for (const service& dependent : each.dependentservices) {
            target.push_back(recordof(dependent));
        }
        reading.targets.push_back(target);
    }
    return reading;
}

// --- what the checker says

std::string textof(const nlohmann::ordered_json& value)
{
    if (value.is_string()) {
        return value.get<std::string>();
    }
    const auto digits = value.at("hex").get<std::string>();
    std::string text;
    for (std::size_t i = 0; i < digits.size(); i += 2) {
        text += static_cast<char>(std::stoi(digits.substr(i, 2), nullptr, 16));
    }
    return text;
}

Record recordof(const nlohmann::ordered_json& members)
{
    Record record;
    for (const auto& [name, value] : members.items()) {
        record[name] = textof(value);
    }
    return record;
}

struct Saying {
    Reading reading;
    std::string findings; // empty: none
};

Saying readbychecker(const std::string& text)
{
    const check::sourcetext source(text);
    check::findings found;
    const check::daemonview view = check::readasdaemon(source.text());
    check::checkshape(source, view, found);
    check::checkvalues(view, found);
    const auto json = nlohmann::ordered_json::parse(
        check::resultjson("mutated.xml", source, view, found.sorted()).dump());
    Saying saying;
    saying.reading.loaded = json.at("loaded").get<bool>();
    for (const auto& each : json.at("targets")) {
        Target target{recordof(each.at("monitored"))};
        for (const auto& dependent : each.at("dependents")) {
            target.push_back(recordof(dependent));
        }
        saying.reading.targets.push_back(target);
    }
    for (const auto& each : json.at("findings")) {
        saying.findings += each.at("rule").get<std::string>() + ": " + textof(each.at("message"));
        saying.findings += '\n';
    }
    return saying;
}

// --- mistakes

class Mutator {
public:
    Mutator(std::string_view whole, unsigned long seed) : sample(whole), random(seed) { survey(); }

    // The sample with a mistake. What it is called is in `name`.
    std::string mutate()
    {
        const auto& [called, make] = kinds.at(below(kinds.size()));
        name = called;
        std::string text(sample);
        make(text);
        return text;
    }

    std::string name;

private:
    struct Span {
        std::size_t begin;
        std::size_t end;
    };

    // Where the tags and the values of the sample are.
    void survey()
    {
        for (std::size_t at = sample.find('<', 2); at != std::string_view::npos;
             at = sample.find('<', at + 1)) {
            const std::size_t end = sample.find('>', at) + 1;
            const bool closing = sample[at + 1] == '/';
            (closing ? closings : openings).push_back({at, end});
            const std::size_t next = sample.find('<', end);
            if (!closing && next != std::string_view::npos && sample[next + 1] == '/') {
                fields.push_back({at, sample.find('>', next) + 1});
                values.push_back({end, next});
            }
        }
    }

    std::size_t below(std::size_t limit) { return static_cast<std::size_t>(random() % limit); }

    template <typename Things>
    typename Things::value_type one(const Things& things)
    {
        return things[below(std::size(things))];
    }

    // Between two elements, or at the end of a line.
    std::size_t gap() { return below(2) == 0 ? one(openings).begin : one(closings).end; }

    char letter() { return static_cast<char>('a' + below(26)); }

    char anybyte() { return static_cast<char>(below(256)); }

    void inserted(std::string& text, std::size_t at, std::string_view what) const
    {
        text.insert(at, what);
    }

    static void replaced(std::string& text, Span span, std::string_view what)
    {
        text.replace(span.begin, span.end - span.begin, what);
    }

    [[nodiscard]] std::string copyof(Span span) const
    {
        return std::string(sample.substr(span.begin, span.end - span.begin));
    }

    [[nodiscard]] std::string fieldname(Span field) const
    {
        const std::size_t end = sample.find('>', field.begin);
        return std::string(sample.substr(field.begin + 1, end - field.begin - 1));
    }

    void misspell(std::string& text, Span tag)
    {
        const std::size_t slash = text[tag.begin + 1] == '/' ? 1 : 0;
        const std::size_t first = tag.begin + 1 + slash;
        const std::size_t place = first + below(tag.end - 1 - first);
        switch (below(3)) {
        case 0:
            text[place] = letter();
            break;
        case 1:
            text.erase(place, 1);
            break;
        default:
            text[place] =
                static_cast<char>(std::isupper(text[place]) != 0 ? std::tolower(text[place])
                                                                 : std::toupper(text[place]));
        }
    }

    static constexpr std::array<std::string_view, 7> kComments{
        "<!-- note -->",    "<!-- a/b -->",           "<!-- a > b -->",  "<!-- <name>x</name> -->",
        "<!--x--><!--y-->", "<!-- \n <stopcmd/> -->", "<!-- never ended"};
    static constexpr std::array<std::string_view, 4> kAttributes{" a='1'", " a=\"x/y\"", " a",
                                                                 " xmlns='urn:x'"};
    static constexpr std::array<std::string_view, 6> kReferences{"&amp;",  "&lt;",  "&gt;",
                                                                 "&quot;", "&#65;", "&#x41;"};
    static constexpr std::array<std::string_view, 5> kInstructions{
        "<?xml version='1.0'?>", "<?php ?>", "<?x a/b?>", "<!DOCTYPE wdtargets>",
        "<!DOCTYPE a [ <!ENTITY b 'c'> ]>"};
    static constexpr std::array<std::string_view, 6> kStrangers{
        "<comment>x</comment>", "<br>", "<group>", "</group>", "<Name>x</Name>", "<>"};
    static constexpr std::array<std::string_view, 5> kTrailers{
        "x", "<a>", "<wdmonitortarget></wdmonitortarget>", "<!-- x -->", ">"};

    std::string_view sample;
    std::mt19937_64 random;
    std::vector<Span> openings;
    std::vector<Span> closings;
    std::vector<Span> fields;
    std::vector<Span> values;

    using Kind = std::pair<const char*, std::function<void(std::string&)>>;
    const std::vector<Kind> kinds{
        {"comment between elements",
         [this](std::string& text) {
             inserted(text, gap(), one(kComments));
         }},
        {"comment in a value",
         [this](std::string& text) {
             inserted(text, one(values).begin, one(kComments));
         }},
        {"attribute",
         [this](std::string& text) {
             inserted(text, one(openings).end - 1, one(kAttributes));
         }},
        {"reference in a value",
         [this](std::string& text) {
             const Span value = one(values);
             inserted(text, value.begin + below(value.end - value.begin), one(kReferences));
         }},
        {"CDATA",
         [this](std::string& text) {
             const Span value = one(values);
             replaced(text, value, "<![CDATA[" + copyof(value) + "]]>");
         }},
        {"no closing tag",
         [this](std::string& text) {
             replaced(text, one(closings), "");
         }},
        {"no opening tag",
         [this](std::string& text) {
             replaced(text, one(openings), "");
         }},
        {"misspelt closing tag",
         [this](std::string& text) {
             misspell(text, one(closings));
         }},
        {"misspelt opening tag",
         [this](std::string& text) {
             misspell(text, one(openings));
         }},
        {"closing tag twice",
         [this](std::string& text) {
             const Span tag = one(closings);
             inserted(text, tag.end, copyof(tag));
         }},
        {"opening tag twice",
         [this](std::string& text) {
             const Span tag = one(openings);
             inserted(text, tag.end, copyof(tag));
         }},
        {"tags crossing",
         [this](std::string& text) {
             const std::size_t first = below(closings.size() - 1);
             const std::string kept = copyof(closings[first]);
             replaced(text, closings[first + 1], kept);
             replaced(text, closings[first], copyof(closings[first + 1]));
         }},
        {"field left out",
         [this](std::string& text) {
             replaced(text, one(fields), "");
         }},
        {"empty field",
         [this](std::string& text) {
             replaced(text, one(values), "");
         }},
        {"blank field",
         [this](std::string& text) {
             replaced(text, one(values), " \n\t");
         }},
        {"tag that closes itself",
         [this](std::string& text) {
             const Span field = one(fields);
             replaced(text, field, "<" + fieldname(field) + (below(2) == 0 ? "/>" : " />"));
         }},
        {"stranger",
         [this](std::string& text) {
             inserted(text, gap(), one(kStrangers));
         }},
        {"declaration",
         [this](std::string& text) {
             inserted(text, gap(), one(kInstructions));
         }},
        {"blank before the declaration",
         [this](std::string& text) {
             inserted(text, 0, below(2) == 0 ? "\n" : "\xef\xbb\xbf");
         }},
        {"broken off",
         [this](std::string& text) {
             text.resize(below(text.size()));
         }},
        {"something behind the root",
         [this](std::string& text) {
             text += one(kTrailers);
         }},
        {"bracket left out",
         [this](std::string& text) {
             const Span tag = below(2) == 0 ? one(openings) : one(closings);
             text.erase(below(2) == 0 ? tag.begin : tag.end - 1, 1);
         }},
        {"bracket in a value",
         [this](std::string& text) {
             const Span value = one(values);
             inserted(text, value.begin + below(value.end - value.begin),
                      below(2) == 0 ? "<" : "< ");
         }},
        {"blank in a tag",
         [this](std::string& text) {
             const Span tag = below(2) == 0 ? one(openings) : one(closings);
             inserted(text, below(2) == 0 ? tag.begin + 1 : tag.end - 1, " ");
         }},
        {"field elsewhere",
         [this](std::string& text) {
             const Span field = one(fields);
             const std::string moved = copyof(field);
             const std::size_t to = gap();
             if (to >= field.end) {
                 inserted(text, to, moved);
                 replaced(text, field, "");
             } else {
                 replaced(text, field, "");
                 inserted(text, std::min(to, field.begin), moved);
             }
         }},
        {"field twice",
         [this](std::string& text) {
             const Span field = one(fields);
             inserted(text, field.end,
                      "<" + fieldname(field) + ">other</" + fieldname(field) + ">");
         }},
        {"byte changed outside values",
         [this](std::string& text) {
             const Span tag = below(2) == 0 ? one(openings) : one(closings);
             text[tag.begin + below(tag.end - tag.begin)] = anybyte();
         }},
        {"byte added outside values",
         [this](std::string& text) {
             const Span tag = below(2) == 0 ? one(openings) : one(closings);
             inserted(text, tag.begin + 1 + below(tag.end - tag.begin - 1),
                      std::string(1, anybyte()));
         }},
        {"byte taken outside values",
         [this](std::string& text) {
             const Span tag = below(2) == 0 ? one(openings) : one(closings);
             text.erase(tag.begin + below(tag.end - tag.begin), 1);
         }},
        {"stretch taken",
         [this](std::string& text) {
             const std::size_t begin = one(openings).begin;
             text.erase(begin, 1 + below(200));
         }},
        {"stretch twice",
         [this](std::string& text) {
             const std::size_t begin = one(openings).begin;
             const std::string copy = text.substr(begin, 1 + below(200));
             inserted(text, gap(), copy);
         }},
    };
};

class Mutations : public ::testing::Test {
protected:
    Mutations()
    {
        std::ifstream file(SAMPLE_CONFIGURATION, std::ios::binary);
        sample = {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
    }

    ~Mutations() override { unlink(mutatedfile().c_str()); }

    // `text` is the sample with a mistake.
    void trymutation(const std::string& text, const Reading& meant)
    {
        const Reading taken = readbydaemon(text);
        const Saying saying = readbychecker(text);
        ASSERT_EQ(saying.reading, taken) << text;
        if (taken != meant) {
            ++changed;
            ASSERT_NE(saying.findings, "") << text;
        }
    }

    const wdLocalLog log{"/dev/null"};
    std::string sample;
    int changed = 0;
};

TEST_F(Mutations, SampleItselfIsReadAsItStandsAndDrawsNoFinding)
{
    const Saying saying = readbychecker(sample);
    EXPECT_EQ(saying.reading, readbydaemon(sample));
    EXPECT_EQ(saying.reading.targets.size(), 1U);
    EXPECT_EQ(saying.findings, "");
}

TEST_F(Mutations, AreReadAsByTheDaemonAndFoundWhereTheyChangeSomething)
{
    constexpr int kMutations = MUTATIONS;
    constexpr unsigned long kSeed = 20261121;
    std::cout << "seed " << kSeed << ": " << kMutations << " mutations\n";
    const Reading meant = readbydaemon(sample);
    Mutator mutator(sample, kSeed);
    std::map<std::string, int> harmful;
    for (int i = 0; i < kMutations; ++i) {
        const std::string text = mutator.mutate();
        const int before = changed;
        ASSERT_NO_FATAL_FAILURE(trymutation(text, meant)) << mutator.name;
        harmful[mutator.name] += changed - before;
    }
    // Most do harm: it is not that nothing has been tried. These never do.
    EXPECT_GT(changed, kMutations / 2);
    const std::set<std::string> harmless{"blank before the declaration", "blank in a tag",
                                         "misspelt closing tag", "tags crossing"};
    for (const auto& [name, count] : harmful) {
        EXPECT_EQ(count > 0, !harmless.contains(name)) << name;
    }
}

// A value that is another one is simply that: what its author wrote.
TEST_F(Mutations, OfAValueAreReadAsWritten)
{
    constexpr int kMutations = 1000;
    constexpr unsigned long kSeed = 7;
    // The same at each run.
    std::mt19937_64 random(kSeed); // NOLINT(cert-msc51-cpp)
    const std::string old = "timeout -k 5 60 service redis-server stop";
    const std::size_t place = sample.find(old);
    ASSERT_NE(place, std::string::npos);
    for (int i = 0; i < kMutations; ++i) {
        std::string value = old;
        for (int byte = 0; byte < 3; ++byte) {
            value[1 + random() % (value.size() - 2)] = static_cast<char>(random() % 256);
        }
        if (value.find_first_of("<&") == std::string::npos) {
            Reading meant = readbydaemon(sample);
            meant.targets[0][0]["stopcmd"] = value;
            std::string text = sample;
            text.replace(place, old.size(), value);
            EXPECT_EQ(readbydaemon(text), meant);
            EXPECT_EQ(readbychecker(text).reading, meant);
        }
    }
}

} // namespace
