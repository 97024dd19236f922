"""Every message of the daemon, as its sources write it and as doc/MESSAGES.md lists it.

from_sources(folder) gives what is written to the log and to standard error, from_document(text)
the entries of the document; both as the same Messages, to be compared. Values are placeholders:
"Executing stop command {COMMAND}". As a program, given the folder, it prints those of its sources.

The sources are read by a small tokenizer, without a compiler. Whatever it does not understand, and
whatever could write past wdlog() and writestandard(), raises NotUnderstood: nothing is left out in
silence. A value that is new in a message has to be named in PLACEHOLDERS below.
"""

import collections
import functools
import pathlib
import re
import sys
from typing import NamedTuple

BLANK = "␠"  # a blank that a reader would not see

STANDARD_ERROR = "stderr"  # in place of a level


class NotUnderstood(Exception):
    """Something that could be a message cannot be read."""


class Message(NamedTuple):
    """One message; several places of the sources may write it."""

    level: str  # ERROR, INFO, DEBUG, or STANDARD_ERROR
    module: str  # as it is written, empty on standard error
    text: str  # without the newline

    def __str__(self):
        """As the document lists it: "LEVEL MODULE TEXT", or "stderr TEXT"."""
        return " ".join(shown(part) for part in self if part)


def shown(text):
    """The text with its blanks visible: those at its ends, and those beside another one."""
    return re.sub(r"^ +| +$| {2,}", lambda blanks: BLANK * len(blanks[0]), text)


# What stands for the value of an expression, by file: {NAME} and so on in the document.
_CONFIGURED = {
    "svc.name": "NAME",
    "svc.binarypath": "PATH",
    "svc.startcmd": "START",
    "svc.stopcmd": "STOP",
    "svc.functionalpingcmd": "CHECK",
    "svc.messageformat": "FORMAT",
    "svc.genpinginterval": "SECONDS",
    "svc.funpinginterval": "SECONDS",
    "svc.maxattemptofwakeup": "N",
    "svc.MaxFPSkips": "N",
    "svc.ThresholdAverageCPUUsage": "LIMIT",
    "svc.ThresholdThreadCount": "LIMIT",
    "svc.ThresholdMemoryUsage": "LIMIT",
    "svc.ThresholdHandleCount": "LIMIT",
}
PLACEHOLDERS = {
    "ProcessStatistics_Linux.cpp": {
        "name": "PATH",
        "pid": "OLD",
        "found": "NEW",
        "averageCPUUsage": "N",
        "numberOfThreads": "N",
        "memoryUsage": "N",
        "thresholdAverageCPUUsage": "LIMIT",
        "thresholdThreadCount": "LIMIT",
        "thresholdMemoryUsage": "LIMIT",
    },
    "wdmonitorthread_linux.cpp": {
        **_CONFIGURED,
        "svc.functionalpingcmd.str()": "CHECK",
        "montarget.monitoredservice.name": "NAME",
        "dependent.name": "DEPENDENT",
        "montarget.dependentservices.size()": "N",
        "fpskipcount": "N",
        "retriesleft": "N",
        "interval": "SECONDS",
        "getpid()": "PID",
        "threadid": "TID",
        "command": "COMMAND",
        "outcome.command": "COMMAND",
        "outcome.firstline": "LINE",
        "outcome.state": "STATUS",
        "state": "STATUS",
        "answer": "ANSWER",
    },
    "wdxmlparserhandler.cpp": _CONFIGURED,
}

# What can write a message, or end the program with one. Each mention has to be a call that is
# understood, or one of those below.
_SPEAKING = frozenset("""
    wdlog LogMessage writestandard refusecommandline deliver writesome
    write writev pwrite send sendto sendmsg sendfile splice dprintf vdprintf
    printf fprintf vprintf vfprintf print println puts fputs putc fputc putchar fwrite
    perror psignal psiginfo err errx warn warnx verr verrx vwarn vwarnx syslog vsyslog
    cerr clog cout wcerr wclog wcout stderr stdout STDERR_FILENO
    assert abort terminate throw
""".split())

# The log and standard error themselves: mentions that carry what others say, or say nothing.
_CARRIERS = {
    ("wdLocalLog_linux.cpp", "LogMessage"): 1,
    ("wdLocalLog_linux.cpp", "STDERR_FILENO"): 2,
    ("wdLocalLog_linux.cpp", "deliver"): 4,
    ("wdLocalLog_linux.cpp", "send"): 1,
    ("wdLocalLog_linux.cpp", "write"): 2,
    ("wdLocalLog_linux.cpp", "writesome"): 2,
    ("wdLocalLog_linux.cpp", "writestandard"): 2,  # itself, and the log's line on standard output
    ("wdLocalLog_linux.h", "LogMessage"): 1,
    ("wdLocalLog_linux.h", "writestandard"): 1,
    ("wdlogbuffer.h", "LogMessage"): 2,
    ("wdlogbuffer.h", "wdlog"): 1,
    ("wdmain.cpp", "STDERR_FILENO"): 4,
    ("wdmain.cpp", "refusecommandline"): 1,
    ("wdmain.cpp", "writestandard"): 1,  # in refusecommandline
    ("xmlscan.cpp", "throw"): 1,  # caught by the manager
}

# Looked for without the tokenizer, too.
_CALLS = re.compile(r"\b(wdlog|LogMessage|writestandard|refusecommandline)\s*\(")

_TOKEN = re.compile(r"""
      (?P<skipped> \s+ | //[^\n]* | /\*.*?\*/ )
    | (?P<directive> ^[ \t]*\#[^\n]* )
    | (?P<raw> \b(?:u8|[uUL])?R" )
    | (?P<string> "(?:[^"\\\n]|\\.)*" )
    | (?P<char> '(?:[^'\\\n]|\\.)+' )
    | (?P<number> \.?\d(?:'?[\w.])* )
    | (?P<word> [A-Za-z_]\w* )
    | (?P<sign> :: | . )
""", re.VERBOSE | re.DOTALL | re.MULTILINE)

_DIRECTIVE = re.compile(r"\s*#\s*(include\b[^\n]*|pragma once\s*)")
_ESCAPES = {"0": "\0", "n": "\n", '"': '"', "'": "'", "\\": "\\"}
_ELSEWHERE = re.compile(r"/dev/(std|fd|tty|pts|console)|>&")
_UNLISTABLE = re.compile("[`{}" + BLANK + r"\x00-\x1f]")
_PAIRS = {"(": ")", "[": "]", "{": "}"}


class _Token(NamedTuple):
    kind: str
    text: str
    line: int


def _unescaped(literal):
    return re.sub(r"\\(.)", lambda found: _ESCAPES[found[1]], literal[1:-1])


def _refuse(name, line, why):
    raise NotUnderstood(f"{name}:{line}: {why}")


def _checked(name, kind, text, line):
    """The token, with a string's escapes resolved."""
    if kind == "directive" and not _DIRECTIVE.fullmatch(text):
        _refuse(name, line, f"a directive that may hide or make messages: {text.strip()}")
    if kind == "raw" or (kind == "sign" and text in "\"'#"):
        _refuse(name, line, "a literal or directive that is not understood")
    if kind == "string":
        try:
            text = _unescaped(text)
        except KeyError:
            _refuse(name, line, f"an escape that is not understood: {text}")
        if _ELSEWHERE.search(text):
            _refuse(name, line, f"a way around standard error: {text}")
    return _Token(kind, text, line)


@functools.lru_cache(maxsize=None)
def _tokens(name, text):
    """The tokens of a file, without blanks, comments and directives."""
    tokens = []
    line = 1
    for found in _TOKEN.finditer(text):
        if found.lastgroup != "skipped":
            tokens.append(_checked(name, found.lastgroup, found[0], line))
        line += found[0].count("\n")
    return [token for token in tokens if token.kind != "directive"]


class _Source:
    """The tokens of one file."""

    def __init__(self, path):
        self.name = path.name
        self.raw = path.read_text()
        self.tokens = _tokens(self.name, self.raw)

    def refuse(self, line, why):
        _refuse(self.name, line, why)

    def text(self, place):
        return self.tokens[place].text if 0 <= place < len(self.tokens) else ""

    def arguments(self, place):
        """The arguments of the call or list whose opening bracket is at `place`, as tokens."""
        closing = [_PAIRS[self.text(place)]]
        arguments = [[]]
        for token in self.tokens[place + 1:]:
            if token.kind == "sign":
                if token.text == closing[-1]:
                    closing.pop()
                    if not closing:
                        return arguments
                elif token.text in _PAIRS:
                    closing.append(_PAIRS[token.text])
                elif token.text == "," and len(closing) == 1:
                    arguments.append([])
                    continue
            arguments[-1].append(token)
        return self.refuse(self.tokens[place].line, "a bracket that is not closed")


def _literal(argument):
    """The text of adjacent string literals, or None for anything else."""
    if not argument or any(token.kind != "string" for token in argument):
        return None
    return "".join(token.text for token in argument)


def _expression(argument):
    return "".join(token.text for token in argument)


class _Reader:
    """Collects the messages of some files."""

    def __init__(self, sources):
        self.sources = sources
        self.levels = self._level_words()
        self.messages = set()
        self.understood = collections.Counter()  # by file and word
        self.left = collections.Counter()

    def read(self):
        for source in self.sources:
            self._read(source)
        known = collections.Counter(_CARRIERS)
        if self.left != known:
            raise NotUnderstood("\n".join(
                f"{name}: {word} where it is not understood: {self.left[name, word]} times, "
                f"known: {known[name, word]}"
                for name, word in sorted(self.left.keys() | known.keys())
                if self.left[name, word] != known[name, word]))
        for source in self.sources:
            self._count(source)
        return self.messages

    def _level_words(self):
        """kLevelError -> ERROR and so on, as the log spells them."""
        words = {}
        for source in self.sources:
            for place, token in enumerate(source.tokens):
                following = source.tokens[place + 1:place + 5]
                if (token.text == "case" and len(following) == 4
                        and following[0].text.startswith("kLevel")
                        and [sign.text for sign in following[1:3]] == [":", "return"]):
                    words[following[0].text] = following[3].text
        if set(words) != {"kLevelDebug", "kLevelInfo", "kLevelError"}:
            raise NotUnderstood(f"levels: {words}")
        return words

    def _read(self, source):
        constants = self._constants(source)
        options = self._options(source)
        for place, token in enumerate(source.tokens):
            word = token.text
            if token.kind != "word":
                continue
            if word == "error" and source.text(place + 1) == "(":
                source.refuse(token.line, "a call of error()")
            if word not in _SPEAKING:
                continue
            done = False
            # What follows a type is a declaration.
            if source.text(place + 1) == "(" and source.text(place - 1) != "void":
                arguments = source.arguments(place + 1)
                if word == "wdlog":
                    done = self._logged(source, token, constants, arguments)
                elif word == "writestandard":
                    done = self._said(source, arguments)
                elif word == "refusecommandline":
                    done = self._refused(source, token, arguments, options)
            if done:
                self.understood[source.name, word] += 1
                if word == "writestandard":
                    self.left[source.name, "STDERR_FILENO"] -= 1
            else:
                self.left[source.name, word] += 1

    def _constants(self, source):
        """kModule = "wdmanager" and the like."""
        constants = {}
        for place, token in enumerate(source.tokens):
            value = source.tokens[place + 1:place + 4]
            if (token.kind == "word" and len(value) == 3 and value[0].text == "="
                    and value[1].kind == "string" and value[2].text == ";"):
                if token.text in constants:
                    source.refuse(token.line, f"{token.text} has two values")
                constants[token.text] = value[1].text
        return constants

    def _options(self, source):
        """The messages of the table of options."""
        messages = []
        for place, token in enumerate(source.tokens):
            if token.text != "valueoption" or source.text(place - 1) == "struct":
                continue
            if source.text(place + 1) == "&":
                continue
            if source.text(place + 2) != "{":
                source.refuse(token.line, "an option that is not understood")
            message = _literal(source.arguments(place + 2)[-1])
            if message is None:
                source.refuse(token.line, "an option whose message is not understood")
            messages.append(message)
        return messages

    def _logged(self, source, token, constants, arguments):
        if len(arguments) < 3:
            source.refuse(token.line, "a log call without a message")
        module = _literal(arguments[0]) or constants.get(_expression(arguments[0]))
        level = self.levels.get(_expression(arguments[1]))
        if not module or not level:
            source.refuse(token.line, "a log call whose module or level is not understood: "
                          f"{_expression(arguments[0])}, {_expression(arguments[1])}")
        names = PLACEHOLDERS.get(source.name, {})
        text = ""
        for piece in arguments[2:]:
            literal = _literal(piece)
            if literal is not None:
                self._check(source, token, literal)
                text += literal
            elif _expression(piece) in names:
                text += "{" + names[_expression(piece)] + "}"
            else:
                source.refuse(token.line, f"a value without a name: {_expression(piece)}")
        self.messages.add(Message(level, module, text))
        return True

    def _said(self, source, arguments):
        text = _literal(arguments[-1])
        if len(arguments) != 2 or _expression(arguments[0]) != "STDERR_FILENO" or text is None:
            return False
        self._add_said(source, arguments[0][0], text.removesuffix("\n"))
        return True

    def _refused(self, source, token, arguments, options):
        text = _literal(arguments[0])
        if text is None and _expression(arguments[0]) != "option.message":
            source.refuse(token.line, f"a refusal that is not understood: "
                          f"{_expression(arguments[0])}")
        for message in options if text is None else [text]:
            self._add_said(source, token, message)
        return True

    def _add_said(self, source, token, text):
        self._check(source, token, text)
        self.messages.add(Message(STANDARD_ERROR, "", text))

    @staticmethod
    def _check(source, token, text):
        if _UNLISTABLE.search(text):
            source.refuse(token.line, f"a message that the document could not show: {text!r}")

    def _count(self, source):
        """Against a count by lines, in case the tokenizer has lost its way."""
        simple = collections.Counter(
            word for line in source.raw.splitlines() if not line.lstrip().startswith("//")
            for word in _CALLS.findall(line))
        read = collections.Counter()
        for counts in self.understood, _CARRIERS:
            for (name, word), number in counts.items():
                if name == source.name and word in ("wdlog", "LogMessage", "writestandard",
                                                    "refusecommandline"):
                    read[word] += number
        if simple != read:
            raise NotUnderstood(f"{source.name}: calls by lines {dict(simple)}, "
                                f"by tokens {dict(read)}")


def from_sources(folder):
    """The messages of all sources of a folder, or NotUnderstood."""
    paths = sorted([*folder.glob("*.cpp"), *folder.glob("*.h")])
    return _Reader([_Source(path) for path in paths]).read()


_LISTED = re.compile(r"`((?:ERROR|INFO|DEBUG|stderr) [^`\n]*)`")


class Entry(NamedTuple):
    """One message of the document."""

    message: Message
    anchor: str
    line: int
    about: str  # what is said of it


def _parsed(entry, line):
    """The message of an entry, which has to show each blank as shown() does, and no other."""
    level, _, rest = entry.partition(" ")
    module, _, text = rest.partition(" ") if level != STANDARD_ERROR else ("", "", rest)
    message = Message(level, module.replace(BLANK, " "), text.replace(BLANK, " "))
    if str(message) != entry:
        raise NotUnderstood(f"line {line}: {entry}\n  should be: {message}")
    return message


def anchor_of(heading):
    """The anchor that a heading gets."""
    return re.sub(r"[^\w\- ]", "", heading.lower()).replace(" ", "-")


def from_document(text):
    """The entries of the document: a line of its own under its heading, or the first cell of a
    table's row with an anchor before it. Anything else that looks like one is NotUnderstood."""
    entries = []
    heading = None
    lines = text.splitlines()
    for number, line in enumerate(lines, 1):
        if line.startswith("#"):
            heading = line.lstrip("# ")
            continue
        alone = re.fullmatch(_LISTED, line)
        row = re.fullmatch(r'\| <a id="([\w-]+)"></a>' + _LISTED.pattern + r" \| (.*) \|", line)
        if alone and heading:
            about = "\n".join(lines[number:]).split("\n#", 1)[0]
            entries.append(Entry(_parsed(alone[1], number), anchor_of(heading), number, about))
            heading = None
        elif row:
            entries.append(Entry(_parsed(row[2], number), row[1], number, row[3]))
        elif _LISTED.search(line):
            raise NotUnderstood(f"line {number}: a message where no entry is expected: {line}")
        elif line.strip():
            heading = None
    return entries


if __name__ == "__main__":
    for known in sorted(from_sources(pathlib.Path(sys.argv[1]))):
        print(known)
