#!/usr/bin/python3
"""reference.py HEADER: prints a public header as doxygen wants it. What stands once in the sources is put where it holds:

- the comment at the top of the header is that of the file;
- the overloads of a function share the doc comment in front of the first;
- what holds the value of a JSON key names that key, as the table of the record's source has it;
- what means the same wherever it stands, RECURRING, is told here, and so are the small members of the templates that every
  source includes.

Lines stay where they are, so that warnings name the right ones.
"""
import glob
import os
import re
import sys

RECURRING = [(re.compile(line), text) for line, text in [
    (r"static json::RecordKeys const& keys\(\);", "The keys of its JSON form in their order, for those who check or describe it."),
    (r"static std::string const PART_NAME;", "The part's name in settings documents."),
    (r"\w+\(json::Value const& j, bool global, bool sorted\);", "Reads the part, as Part does."),
    (r"json::(Value|Object|Array) serialize\(\) const", "The JSON form that the class tells."),
    (r"static constexpr unsigned char CMD_ID", "The command's number, by which it travels."),
    (r"^\s*\w+\((unsigned char id, )?std::shared_ptr<CmdProcessorI> processor\)[ ;]", "A command that is read: what it carries comes with the message."),
    (r"^\s*\w+\((unsigned char id, )?std::shared_ptr<CmdProcessorI> processor,", "A command that is sent."),
    (r"void setResp\(", "Sets the answer: the affair of the processor that handles the command."),
    (r"const& resp\(\) const", "The answer; empty until there is one."),
    (r"bool (resp|removed)OK\(\) const", "Whether the answer says that it is done."),
    (r"json::Object const& (reqParams|params|req)\(\) const", "What the command carries."),
    (r"Cfg::Id const& cfgId\(\) const", "The node."),
    (r"virtual void visit\(", "Handles a command of that class."),
    (r"^\s*(\w+)\(\1 const&( other)?\)", "What a copy shares with this one is told at the class."),
    (r"^\s*(\w+)& operator=\(\1 const&( other)?\)", "What a copy shares with this one is told at the class."),
    (r"^\s*(\w+)\(\1&& other\)|^\s*(\w+)& operator=\(\2&& other\)", "The other one is the empty handle then."),
    (r"bool operator==\(", "Whether both say the same."),
    (r"bool operator!=\(", "Whether both do not say the same."),
    (r"static bool fits\(Value const& node\)", "Whether the node has this form."),
    (r"static .*read\(Value const& node\)", "The value that the node holds."),
    (r"static Value write\(", "The node of a value."),
    (r"static KeyForm describe\(\)", "The form in words, for those who check or describe keys."),
    (r"using (iterator_category|value_type|difference_type|reference|pointer) =", "As std::iterator_traits has it."),
    (r"operator(\*|\+\+)\(", "As of every input iterator."),
    (r"explicit Iterator\(Value", "At the beginning."),
    (r"inline Iterator end\(\)", "Behind the last one."),
    (r"json::KeyRow describe\(\) const", "Its row among the keys of the part."),
    (r"void combineParent\(Field", "Takes the parent's value, or its elements, where it has none of its own."),
    (r"void addOwn\(", "Puts an own element behind the last own one, in front of all when there is none."),
    (r"void addInherited\(", "Puts an inherited element behind all others."),
    (r"Field\(char const\* fieldKey", "A field of that key, which is not owned, and what it holds to begin with."),
    (r"bool isInherited\(\) const", "Whether the value is not the node's own."),
    (r"void setOwn\(", "Gives the node a value of its own."),
    (r"Part\(bool global, Fields", "The part as it is when nothing is set."),
    (r"^struct Field<T, Value<T>>", "A setting with its key."),
    (r"long long toInt\(\) const|bool toBool\(\) const", "The value; throws Exc for another type."),
    (r"Object\(std::initializer_list", "An object of these members. Throws Exc when a value is the empty handle."),
    (r"^struct Form<(bool|std::string)>|^struct json::Form<", "How a value of that type stands in JSON."),
    (r"^\s*(explicit )?(?:Department|Profile|ExtractPreset|ExtractZone|ExtractZones|LetterheadInf)\((bool|std::string|std::vector)", "Of these; all else is as by default."),
    (r"static bool \w+Str\(std::string", "The same of the text of an id."),
    (r"static constexpr ModeRules RULES", "The rules on its bits."),
    (r"^enum class VLSERVICE_EXPORT \w+FieldIdxs", "The settings of the part, in the order of its fields."),
    (r"^using \w+Fields =", "The fields of the part."),
    (r"^using Set\w+ = SetPartTmpl", "Sets that part of a node."),
    (r"^inline json::Value wrap\(", "The wrapper of a plain value."),
    (r"^RootDefault\(T\) ->", "Of what it is given."),
    (r"^struct KeyRow", "A key of a record."),
    (r"valueType\(\) const", "The kind of its values."),
    (r"Validate\w+\(json::Object const& object", "Of a field's JSON. Throws json::Exc for a limit or a default of a wrong type."),
    (r"size\(\) const", "How many there are: elements, members or bytes."),
    (r"bool empty\(\) const", "Whether there is none."),
]]
CLASS = re.compile(r"^(\s*)(?:class|struct)(?: VLSERVICE_EXPORT)? (\w+(?:::\w+)?)\b[^;]*\{$")
NAME = re.compile(r"(operator[^ (]+|\w+)\(")
GETTER = re.compile(r"\) (?:const )?\{ return (\w+);")
SETTER = re.compile(r"void set\w+\([^)]*\)(?: const)? \{ (\w+) = ")
MEMBER = re.compile(r"^\s+[\w:<>]+ (\w+)(?: = [\w:]+)?;$")
TOP = re.compile(r"^#pragma once\n((?://.*\n)+)")
KEY = re.compile(r'json::Key\{"(\w+)", &(\w+)::(\w+)')


def keys_of(header):
    """The JSON keys of the records beside the header, by class and member."""
    keys = {}
    for source in glob.glob(os.path.join(os.path.dirname(header), "*.cpp")):
        with open(source, encoding="utf-8") as file:
            keys.update({(record, member): key for key, record, member in KEY.findall(file.read())})
    return keys


def from_key(line, record, keys):
    """What is known of a line by the key whose value it holds."""
    for form, text in ((SETTER, 'Sets what the key "%s" holds.'), (GETTER, 'What the key "%s" holds.'), (MEMBER, 'What the key "%s" holds.')):
        if (match := form.search(line)) and (record, match[1]) in keys:
            return text % keys[record, match[1]]
    return None


def from_rule(line):
    return next((text for form, text in RECURRING if form.search(line)), None)


class Reference:
    def __init__(self, keys):
        self.keys, self.records = keys, []
        self.comment, self.name = [], None
        self.is_after_comment = False

    def line(self, line):
        """The line with the comment that it wants in front."""
        if line.lstrip().startswith("///"):
            self.comment = self.comment + [line.strip()[4:]] if self.is_after_comment else [line.strip()[4:]]
            self.is_after_comment, self.name = True, None
            return line
        self.enter(line)
        name = NAME.search(line)
        wants = not self.is_after_comment and "///<" not in line
        text = self.shared(line, name) or from_key(line, self.record(), self.keys) or from_rule(line) if wants else None
        self.remember(line, name)
        return "/** %s */%s" % (text, line) if text else line

    def record(self):
        return self.records[-1][1] if self.records else None

    def enter(self, line):
        """Knows the class that the line stands in."""
        if match := CLASS.match(line):
            self.records.append((match[1], match[2]))
        elif self.records and line.startswith(self.records[-1][0] + "};"):
            self.records.pop()

    def shared(self, line, name):
        return " ".join(self.comment) if self.comment and name and name[1] == self.name else None

    def remember(self, line, name):
        if self.is_after_comment and not line.lstrip().startswith("template"):
            self.is_after_comment, self.name = False, name[1] if name else None
        elif not line.strip():
            self.comment, self.name = [], None


def main(header):
    reference = Reference(keys_of(header))
    with open(header, encoding="utf-8") as file:
        text = TOP.sub(lambda top: "/// \\file\n" + top[1].replace("//", "///"), file.read())
        for line in text.split("\n"):
            print(reference.line(line))


if __name__ == "__main__":
    main(sys.argv[1])
