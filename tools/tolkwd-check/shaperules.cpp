#include "ruletables.h"

#include <array>

namespace check {

namespace {

constexpr std::array<rule, 23> kRules{{
    {"unreadable-file", "the file cannot be read",
     "The daemon would write one line on standard error, watch nothing, and try again at the next "
     "refresh. Mend the path, or who may read the file.",
     "tolkwd-check tolkwd.xlm", "tolkwd-check tolkwd.xml"},
    {"not-text", "the file is not in UTF-8, or no text at all",
     "The daemon reads bytes. In UTF-16, which some editors write, it finds no element that it "
     "knows, and watches nothing. Save the file as UTF-8, without a byte order mark.",
     "a file saved as \"Unicode\"", "the same saved as UTF-8"},
    {"declaration", "a declaration that is not at the first byte, or another \"<?\"",
     "The daemon skips one declaration, at the first byte of the file. Blanks before it, a byte "
     "order mark or a second one make it read pieces of the declaration as text or as an element "
     "that never ends; inside a target that loses the target.",
     "\n<?xml version='1.0'?>\n<wdtargets>", "<?xml version='1.0'?>\n<wdtargets>"},
    {"unfinished-file", "the file does not end with the closing tag of its root",
     "The reading ends where the last \">\" of the file is that of </wdtargets>. A file that "
     "breaks "
     "off, perhaps because it was read while somebody wrote it, is read as far as it goes, and "
     "what is missing is not watched. Write a new file beside the old one and move it into place.",
     "  </wdmonitortarget>", "  </wdmonitortarget>\n</wdtargets>"},
    {"trailing-text", "something follows the closing tag of the root",
     "The daemon reads on behind </wdtargets>: a target there is watched, too, and other text can "
     "change where the reading ends. Put every target before the closing tag.",
     "</wdtargets>\n<wdmonitortarget>...", "<wdmonitortarget>...</wdmonitortarget>\n</wdtargets>"},
    {"empty-tag", "a tag without a name, or one that closes itself",
     "<stopcmd/>, <> and < > make the whole load fail. The daemon writes \"Loadservices error.\" "
     "and watches nothing until the next refresh. Write NULL for a command that is not there, and "
     "a number for a number.",
     "<stopcmd/>", "<stopcmd>NULL</stopcmd>"},
    {"comment", "a comment",
     "The daemon takes a comment for an element of an unknown name, which is never closed: inside "
     "a target it loses that target without a word. One that holds a \"/\" closes what is open "
     "instead, and the fields behind it go elsewhere. Between targets a comment mostly does no "
     "harm, but of two targets in one comment the second is watched. Keep notes in another file.",
     "<!-- the web server -->\n<name>web</name>", "<name>web</name>"},
    {"attribute", "an attribute",
     "The daemon takes the whole tag for the name of an element, which it does not know and never "
     "closes. An attribute with a \"/\" makes a closing tag of it.",
     "<name lang='en'>web</name>", "<name>web</name>"},
    {"entity", "an entity reference, such as &amp;",
     "Values are taken byte for byte. Write the character itself; only \"<\" cannot be written: "
     "put "
     "a command that needs it in a script.",
     "<startcmd>a &amp;&amp; b</startcmd>", "<startcmd>a && b</startcmd>"},
    {"cdata", "a CDATA section",
     "The daemon takes it for an element of an unknown name, which is never closed. Values need no "
     "such protection, they are taken byte for byte; only \"<\" cannot be written.",
     "<startcmd><![CDATA[a && b]]></startcmd>", "<startcmd>a && b</startcmd>"},
    {"doctype", "a document type",
     "The daemon takes it for an element of an unknown name, which is never closed. Leave it out.",
     "<!DOCTYPE wdtargets>", "<wdtargets>"},
    {"unknown-element", "an element that the daemon does not know",
     "An element of another name is never closed: inside a target it loses that target without a "
     "word, and before that, the fields behind it go to a dependent. Names are told apart by upper "
     "and lower case, too.",
     "<stopcommand>NULL</stopcommand>", "<stopcmd>NULL</stopcmd>"},
    {"mismatched-tag", "a closing tag that is misspelt, crosses another, is missing or too many",
     "A closing tag closes the innermost open element, whatever its name. So a misspelt one does "
     "no "
     "harm, but a missing one or one too many moves what follows into other elements: values end "
     "up "
     "in other fields or services, and targets are lost.",
     "<name>web\n<binarypath>/usr/sbin/webd</binarypath>",
     "<name>web</name>\n<binarypath>/usr/sbin/webd</binarypath>"},
    {"less-than", "a \"<\" that begins no tag",
     "For the daemon every \"<\" begins a tag, also in a value, and the value ends there. Put a "
     "command that needs one in a script.",
     "<startcmd>load < /etc/rules</startcmd>", "<startcmd>/usr/local/sbin/load-rules</startcmd>"},
    {"misplaced-element", "a service outside a target",
     "A service belongs inside a wdmonitortarget. Outside it fills the record that the next target "
     "starts from, and is not watched itself.",
     "<wdmonitorservice>...</wdmonitorservice>",
     "<wdmonitortarget>\n<wdmonitorservice>...</wdmonitorservice>\n</wdmonitortarget>"},
    {"misplaced-field", "a field outside a service",
     "Anywhere but in a wdmonitorservice a field fills the record of the next dependent service, "
     "which then has it unless it says otherwise.",
     "<wdmonitortarget>\n<startcmd>NULL</startcmd>",
     "<wdmonitortarget>\n<wdmonitorservice>\n<startcmd>NULL</startcmd>"},
    {"missing-field", "a field that a service leaves out",
     "There are no defaults. A field that is left out keeps the value of the previous service of "
     "its kind, also from another target; after a refresh the first service of the file starts "
     "from the last one's values. Write all sixteen fields in every service.",
     "<name>db</name>", "<name>db</name>\n<startcmd>NULL</startcmd> and so on"},
    {"empty-field", "a field without a text",
     "An empty element is not the empty text: it takes the last text before it, which is mostly "
     "the \">\" that the daemon reads behind a closing tag. Write NULL for a command, a number for "
     "a number.",
     "<stopcmd></stopcmd>", "<stopcmd>NULL</stopcmd>"},
    {"duplicate-field", "a field that stands twice in one service",
     "The last one counts. Take the other out.",
     "<startcmd>NULL</startcmd>\n<startcmd>service web start</startcmd>",
     "<startcmd>service web start</startcmd>"},
    {"missing-service", "a target without a service of its own",
     "A wdmonitortarget without a wdmonitorservice watches the service of the target before it "
     "once "
     "more: two monitors then recover it.",
     "<wdmonitortarget>\n<wdmondependsev>...",
     "<wdmonitortarget>\n<wdmonitorservice>...</wdmonitorservice>\n<wdmondependsev>..."},
    {"second-service", "a target with two services",
     "Only one service of a target is watched: the last, with the values of the first where it has "
     "none of its own. Give each a target, or make the other a dependent.",
     "<wdmonitorservice>web...\n<wdmonitorservice>db...",
     "<wdmonitorservice>web...\n<wdmondependsev>db..."},
    {"stray-text", "text between elements",
     "It means nothing by itself, but the next empty element takes it for its value. Often it is "
     "what is left of a tag.",
     "stopcmd>NULL</stopcmd>", "<stopcmd>NULL</stopcmd>"},
    {"no-target", "nothing to watch",
     "The file has no wdmonitortarget. The daemon runs, says nothing, and watches nothing.",
     "<wdtargets>\n</wdtargets>",
     "<wdtargets>\n<wdmonitortarget>...</wdmonitortarget>\n</wdtargets>"},
}};

} // namespace

std::span<const rule> shaperules() noexcept
{
    return kRules;
}

} // namespace check
