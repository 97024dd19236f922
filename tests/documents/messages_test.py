"""doc/MESSAGES.md lists exactly the messages of the sources.

And tests of that: changed copies of the sources and of the document, whose change has to be
noticed, or to be refused as not understood.
"""

import pathlib
import re

import pytest

import messages
from messages import Message, NotUnderstood

PROJECT = pathlib.Path(__file__).resolve().parents[2]
SOURCES = PROJECT / "src"
DOCUMENT = (PROJECT / "doc" / "MESSAGES.md").read_text()

PINGS = "wdmonitorthread_linux.cpp"
STOPPED = Message("DEBUG", "wdmonitorthread", "General ping failed!")


def difference(folder, document):
    """What only one of the two has, to be read; empty where they agree."""
    sources = messages.from_sources(folder)
    entries = messages.from_document(document)
    listed = {entry.message for entry in entries}
    lines = {entry.message: entry.line for entry in entries}
    return ([f"not in the document: {missing}" for missing in sorted(sources - listed)]
            + [f"not in the sources (line {lines[extra]} of the document): {extra}"
               for extra in sorted(listed - sources)])


def test_the_document_lists_the_messages_of_the_sources():
    found = difference(SOURCES, DOCUMENT)
    if found:
        pytest.fail("\n".join(found), pytrace=False)


def test_each_message_is_listed_once():
    listed = [entry.message for entry in messages.from_document(DOCUMENT)]
    assert [str(message) for message in listed if listed.count(message) > 1] == []


def test_each_entry_says_when_what_it_means_and_what_to_do():
    for entry in messages.from_document(DOCUMENT):
        if "\n" in entry.about:
            said = [re.search(f"^- {label}: .", entry.about, re.MULTILINE)
                    for label in ("When", "Means", "Do")]
            assert all(said), f"line {entry.line}: {entry.message}"
        else:
            assert all(cell.strip() for cell in entry.about.split(" | ")), f"line {entry.line}"


def test_anchors_are_distinct_and_links_lead_to_one():
    headings = [messages.anchor_of(line.lstrip("# ")) for line in DOCUMENT.splitlines()
                if line.startswith("#")]
    anchors = headings + re.findall(r'<a id="([^"]*)">', DOCUMENT)
    assert len(anchors) == len(set(anchors))
    assert set(re.findall(r"\]\(#([^)]*)\)", DOCUMENT)) <= set(anchors)
    assert {entry.anchor for entry in messages.from_document(DOCUMENT)} <= set(anchors)


def test_the_placeholders_are_explained():
    used = {name for message in messages.from_sources(SOURCES)
            for name in re.findall(r"{\w+}", message.text)}
    table = DOCUMENT.split("| shown as | is |")[1].split("\n\n")[0]
    assert set(re.findall(r"{\w+}", table)) == used


def test_what_is_read_from_the_sources():
    known = messages.from_sources(SOURCES)
    assert {
        STOPPED,
        # several literals, cut off by values and line breaks
        Message("ERROR", "wdmonitorthread",
                "General ping failed for service {NAME}. Try to general ping more times now, if "
                "failed 3 times, will generally recover this service."),
        Message("DEBUG", "ProcessStatistics",
                "({PATH}) PID changed (old = {OLD}, new = {NEW})"),
        # values without a text between them; blanks at the ends
        Message("DEBUG", "wdmonitorthread",
                "User provided stop command dep: {COMMAND}{DEPENDENT}"),
        Message("ERROR", "wdmonitorthread", "Current pointer found NULL "),
        # both names of a module, and a value alone
        Message("DEBUG", "wdxmlparserhandler ", "{STOP}"),
        Message("DEBUG", "wdxmlparserhandler", "Threshold value of memory usage: {LIMIT}"),
        # standard error: the table of options, a refusal, and the two others
        Message("stderr", "", "'-t' used but no check time specified "),
        Message("stderr", "", "output log file path not specified"),
        Message("stderr", "", "Unable to open the log file"),
        Message("stderr", "", "error, unable to open the input file: 0"),
    } <= known


def test_blanks_are_shown():
    text = " a  b c "
    assert str(Message("DEBUG", "module ", text)) == "DEBUG module␠ ␠a␠␠b c␠"
    assert messages.from_document(f"### One\n\n`DEBUG module␠ {messages.shown(text)}`\n")[
        0].message == Message("DEBUG", "module ", text)


@pytest.fixture
def in_agreement():
    """What a change alone leads to is only seen where the two agree; one failure says enough."""
    if difference(SOURCES, DOCUMENT):
        pytest.skip("the document does not list the messages of the sources")


@pytest.fixture
def sources(tmp_path):
    """A copy of the sources; changed(FILE, OLD, NEW) replaces a text that is there once."""
    folder = tmp_path / "src"
    folder.mkdir()
    for path in SOURCES.iterdir():
        (folder / path.name).symlink_to(path)

    def changed(name, old, new):
        text = (SOURCES / name).read_text()
        assert text.count(old) == 1, f"{name}: {old}"
        (folder / name).unlink()
        (folder / name).write_text(text.replace(old, new))
        return folder

    return changed


# A call beside which another one is put.
BESIDE = "    wdlog(kModule, kLevelDebug, \"Now start dependent services\");"

MISSING = "not in the document: "
EXTRA = "not in the sources"


@pytest.mark.parametrize("name, old, new, expected", [
    pytest.param(PINGS, '"General ping failed!"', '"General ping failed?"',
                 [MISSING + "DEBUG wdmonitorthread General ping failed?", EXTRA], id="a letter"),
    pytest.param(PINGS, 'NULL "', 'NULL"',
                 [MISSING + "ERROR wdmonitorthread Current pointer found NULL", EXTRA],
                 id="a blank at the end"),
    pytest.param(PINGS, 'wdlog(kModule, kLevelDebug, "All dependent services stopped");', "",
                 [EXTRA], id="a message removed"),
    pytest.param(PINGS, BESIDE,
                 BESIDE + '\nwdlog(\n  kModule,  // why\n  kLevelInfo, "a "\n  "b");',
                 [MISSING + "INFO wdmonitorthread a b"], id="a message added"),
    pytest.param(PINGS, 'kLevelDebug, "General ping failed!', 'kLevelInfo, "General ping failed!',
                 [MISSING + "INFO wdmonitorthread General ping failed!", EXTRA], id="a level"),
    pytest.param(PINGS, '"General ping failed for service ", svc.name,\n'
                 '                  ", unrecognized', '"General ping failed for service ", '
                 'svc.binarypath,\n                  ", unrecognized',
                 [MISSING + "ERROR wdmonitorthread General ping failed for service {PATH}, "
                  "unrecognized service.", EXTRA], id="a value"),
    pytest.param("wdxmlparserhandler.cpp", "wdlog(kListingModule, kLevelDebug, \"maxattempt \"",
                 "wdlog(kLimitsModule, kLevelDebug, \"maxattempt \"",
                 [MISSING + "DEBUG wdxmlparserhandler maxattempt {N}", EXTRA], id="a module"),
    pytest.param("wdmanager_linux.cpp", 'kModule = "wdmanager"', 'kModule = "manager"',
                 [MISSING] * 5 + [EXTRA] * 5, id="a module's name"),
    pytest.param("wdLocalLog_linux.cpp", 'return "INFO"', 'return "NOTE"',
                 [MISSING] * 7 + [EXTRA] * 7, id="a level's word"),
    pytest.param("wdmain.cpp", "\"'-t' used", "\"'-T' used",
                 [MISSING + "stderr '-T' used but no check time specified␠", EXTRA],
                 id="the table of options"),
    pytest.param("wdmain.cpp", "\"output log file", "\"log file",
                 [MISSING + "stderr log file path not specified", EXTRA], id="a refusal"),
    pytest.param("xmlscan.cpp", "input file: 0", "input file: 1",
                 [MISSING + "stderr error, unable to open the input file: 1", EXTRA],
                 id="standard error"),
    pytest.param(PINGS, BESIDE, "//" + BESIDE, [EXTRA], id="a message commented out"),
])
@pytest.mark.usefixtures("in_agreement")
def test_a_change_of_the_sources_is_noticed(sources, name, old, new, expected):
    found = difference(sources(name, old, new), DOCUMENT)
    assert len(found) == len(expected)
    for line, beginning in zip(found, expected):
        assert line.startswith(beginning)


@pytest.mark.parametrize("added, why", [
    ("wdlog(kModule, kLevelDebug, dependents);", "a value without a name: dependents"),
    ('wdlog(kModule, kLevelDebug, helped ? "a" : "b");', "a value without a name"),
    ('wdlog(kModule, kLevelDebug, std::string("a"));', "a value without a name"),
    ("wdlog(kModule, kLevelDebug);", "without a message"),
    ('wdlog(kModule, 1, "a");', "level is not understood"),
    ('wdlog(module, kLevelDebug, "a");', "module or level is not understood"),
    ('wdlog(kModule, kLevelDebug, R"(a)");', "a literal or directive"),
    ('wdlog(kModule, kLevelDebug, "a\\x62");', "an escape"),
    ('wdlog(kModule, kLevelDebug, "a `b`");', "could not show"),
    ('wdlog(kModule, kLevelDebug, "a {b}");', "could not show"),
    ("const auto say = wdlog<std::string>;", "wdlog where it is not understood"),
    ("WDLogBuffer buffer;\n wdLocalLog::LogMessage(kModule, 0, buffer.str(buffer << 1));",
     "LogMessage where it is not understood: 1 times, known: 0"),
    ('writestandard(STDERR_FILENO, text + "\\n");', "writestandard where it is not understood"),
    ('writestandard(2, "a\\n");', "writestandard where it is not understood"),
    ('std::cerr << "a";', "cerr where it is not understood"),
    ('std::fprintf(stderr, "a");', "fprintf where it is not understood"),
    ('perror("a");', "perror where it is not understood"),
    ('error(0, 0, "a");', "error()"),
    ('throw std::runtime_error("a");', "throw where it is not understood"),
    ('std::ofstream("/dev/stderr") << "a";', "a way around"),
    ('runforeffect("echo a >&2");', "a way around"),
    ("#define log wdlog", "a directive"),
    ("#ifdef LOUD\n#endif", "a directive"),
])
def test_what_is_not_understood_is_refused(sources, added, why):
    folder = sources(PINGS, BESIDE, f"{added}\n{BESIDE}")
    with pytest.raises(NotUnderstood) as refusal:
        messages.from_sources(folder)
    assert why in str(refusal.value)


@pytest.mark.parametrize("name, old, new, why", [
    ("wdmain.cpp", 'refusecommandline("input', 'refusecommandline(text); refusecommandline("input',
     "a refusal that is not understood: text"),
    ("wdmain.cpp", "constexpr valueoption kLogOption{", "constexpr valueoption kLogOption = make{",
     "an option that is not understood"),
    ("wdLocalLog_linux.cpp", "        return write(to.fd, text.data(), text.size());",
     "        write(2, text.data(), text.size());\n"
     "        return write(to.fd, text.data(), text.size());",
     "write where it is not understood: 3 times, known: 2"),
    ("wdlogbuffer.h", "    WDLogBuffer buffer;\n",
     "    WDLogBuffer buffer;\n    wdLocalLog::LogMessage(module, level, \"more\");\n",
     "LogMessage where it is not understood: 3 times, known: 2"),
    # The tokenizer takes this for a comment; a count by lines does not.
    (PINGS, BESIDE, f"    /* a\n{BESIDE} */", "calls by lines"),
])
def test_other_places_are_watched_too(sources, name, old, new, why):
    with pytest.raises(NotUnderstood) as refusal:
        messages.from_sources(sources(name, old, new))
    assert why in str(refusal.value)


@pytest.mark.usefixtures("in_agreement")
def test_a_new_file_is_read(sources):
    folder = sources(PINGS, BESIDE, BESIDE)
    (folder / "new.cpp").write_text('void f() { wdlog("new", kLevelError, "a"); }\n')
    assert difference(folder, DOCUMENT) == [MISSING + "ERROR new a"]


ROW = re.search(r'^\| <a id="ping-stopped".*$', DOCUMENT, re.MULTILINE)[0]
ENTRY = "`ERROR wdmanager Loadservices error.`"


@pytest.mark.parametrize("old, new, expected", [
    (ROW + "\n", "", [MISSING + "DEBUG wdmonitorthread General ping failed!"]),
    (ROW, ROW.replace("failed!", "failed?"), [MISSING, EXTRA]),
    (ROW, ROW + "\n" + ROW.replace("failed!", "failed?"), [EXTRA]),
    (ROW, ROW.replace("DEBUG", "INFO"), [MISSING, EXTRA]),
    (ROW, ROW.replace("wdmonitorthread", "wdmanager"), [MISSING, EXTRA]),
    (ROW, ROW.replace("`", ""), [MISSING]),
    (ENTRY, ENTRY.replace("s err", "s  Err").replace("  ", "␠␠"), [MISSING, EXTRA]),
    ("wdxmlparserhandler␠ maxattempt ", "wdxmlparserhandler maxattempt ", [MISSING, EXTRA]),
    ("NULL␠`", "NULL`", [MISSING, EXTRA]),
])
@pytest.mark.usefixtures("in_agreement")
def test_a_change_of_the_document_is_noticed(old, new, expected):
    assert DOCUMENT.count(old) == 1
    found = difference(SOURCES, DOCUMENT.replace(old, new))
    assert len(found) == len(expected)
    for line, beginning in zip(found, expected):
        assert line.startswith(beginning)


@pytest.mark.parametrize("old, new", [
    pytest.param(ENTRY, ENTRY.replace("s err", "s  err"), id="two plain blanks"),
    pytest.param(ENTRY, ENTRY.replace("s err", "s␠err"), id="a blank that need not be shown"),
    pytest.param(ENTRY, "- " + ENTRY, id="not a line of its own"),
    pytest.param("### The load failed", "The load failed", id="no heading"),
    pytest.param('<a id="ping-stopped"></a>', "", id="no anchor"),
])
def test_an_entry_that_is_not_understood_is_refused(old, new):
    assert DOCUMENT.count(old) == 1
    with pytest.raises(NotUnderstood):
        messages.from_document(DOCUMENT.replace(old, new))
