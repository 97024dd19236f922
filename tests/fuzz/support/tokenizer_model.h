// A plain second account of how the configuration reader cuts its text into tokens, to hold the
// reader against. One function per rule, one variable per notion, no thought of speed.
//
// The dialect is the texts for which the rules lead somewhere. They walk from the first "<" and end
// when the current place meets the text's last ">", which is how a document ends that closes its
// root last, or at a tag without a name. They lead nowhere, and the model calls the ending open,
//   - when a search runs off the text: a "<" without its ">", a first "<?" without its "?>", text
//     or other tags behind the closing root tag, no closing root tag at all;
//   - at a "<?" that comes late: the skip always leads behind the same "?", near the start of the
//     text, and from there back to that "<?" without end.
// Up to there the tokens are as certain as in any other text.
#pragma once

#include <string>
#include <vector>

struct Token {
    enum class Kind {
        startTag,
        text,
        endTag,
        endOfDocument,
        tagWithoutName // std::out_of_range left the reader
    };
    Kind kind;
    std::string text;

    bool operator==(const Token&) const = default;
};

struct Reading {
    std::vector<Token> tokens;
    bool open = false; // what comes behind these tokens is the reader's choice
};

Reading readbymodel(const std::string& text);
