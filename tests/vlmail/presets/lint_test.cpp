#include "programs/vlmail/presets/finding.h"
#include "tests/support/time_limit.h"
#include "tests/vlmail/presets/settings_file.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <vector>

using namespace VlMail;
using testing::HasSubstr;

namespace {

struct Case {
    /// What the document has wrong, as a name.
    std::string name;
    std::string json;
    /// All that is found: "error /place: what happens | what to do [kind]".
    std::vector<std::string> findings;
};

std::vector<std::string> findingsIn(std::string const& json) {
    SettingsFile const file(json);
    Ran const ran = runVlMail({"presets", "lint", file.path()});
    std::vector<std::string> lines;
    std::istringstream out(ran.out);
    std::string what;
    std::string advice;
    while (std::getline(out, what) && !what.starts_with(file.path()) && std::getline(out, advice))
        lines.push_back(what + " | " + advice.substr(advice.find_first_not_of(' ')));
    return lines;
}

/// A preset with a good zone and these keys.
std::string preset(std::string const& keys) { return "{" + keys + R"(, "zones": [)" + zoneWith("") + "]}"; }

constexpr char const* UNUSABLE_RULES =
    R"_({"name": "P", "production": {"window": {"left": 9000, "top": 0, "right": 100, "bottom": 100}, "clear_zones": [{"left": 0, "top": 0, "right": 999999, "bottom": 1}], "postcode": "(a+)+b", "tolerence": 5, "address_lines": {"min": "3"}}})_";
constexpr char const* USABLE_RULES =
    R"_({"name": "P", "production": {"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}, "postcode": "\\b\\d{5}\\b", "repair": ["cover-page"]}})_";

std::vector<Case> const CASES{
    {"NothingAtAll", R"_({})_", {}},
    {"NothingInAGoodField", partWithField(R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$"})_"), {}},
    {"APartThatIsNone",
     R"_({"preset": {}})_",
     {"error /preset: \"preset\" is no settings part: the whole document is refused | name the parts "
      "\"app\", \"inet\", \"po\", \"deps\", \"profiles\" or \"presets\" [unknown-part]"}},
    {"AMisspeltKey",
     partWithField(R"_({"name": "ref", "value_extrct": "^Ref: (?<VAL>.*)$", "default_value": "none"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extrct: \"value_extrct\" is no known key and changes "
      "nothing | write \"value_extract\" [misspelt-key]"}},
    {"AMisspeltKeyWhereOthersAreKept",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P")_"),
            R"_({"name": "P", "dupleks": true, "cost_centre": "4711"})_"),
     {"error /pack_presets/0/dupleks: \"dupleks\" is no known key and changes nothing | write \"duplex\" "
      "[misspelt-key]"}},
    {"AnUnknownKey",
     partWithField(R"_({"name": "ref", "default_value": "none", "colour": "red"})_"),
     {"warning /extract_presets/0/zones/0/fields/1/colour: \"colour\" is no known key and changes nothing | "
      "remove it, or look its name up [unknown-key]"}},
    {"KeysThatNobodyActsOn",
     R"_({"app": {"debug_view": 3, "m": 0, "dep_alias": "cost centre"}})_",
     {"warning /app/debug_view: \"debug_view\" is kept and handed on, and changes nothing here | remove it "
      "unless another program reads it [carried-only]",
      "warning /app/dep_alias: \"dep_alias\" is kept and handed on, and changes nothing here | remove it "
      "unless another program reads it [carried-only]"}},
    {"AKeyThatNobodyActsOnInAPreset",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P", "ocr_mode": 1, "retry_on_repeated": 0)_"),
            R"_({"name": "P", "process_mode_client": 1})_"),
     {"warning /extract_presets/0/ocr_mode: \"ocr_mode\" is kept and handed on, and changes nothing here | "
      "remove it unless another program reads it [carried-only]",
      "warning /pack_presets/0/process_mode_client: \"process_mode_client\" is kept and handed on, and "
      "changes nothing here | remove it unless another program reads it [carried-only]"}},
    {"TheSpellingOfEnfoceDep",
     R"_({"app": {"enforce_dep": true, "enforce_po": true}})_",
     {"error /app/enforce_dep: \"enforce_dep\" is no known key and changes nothing | write \"enfoce_dep\" "
      "[misspelt-key]"}},
    {"AKeyThatStandsTwice",
     R"_({"extract_presets": [], "pack_presets": [], "pack_presets": []})_",
     {"error (the document): a key stands twice in one object, and only the last one counts: duplicate "
      "object key near '\"pack_presets\"', line 1 | remove one of the two [duplicate-key]"}},
    {"DroppedKeys",
     partOf(
         preset(R"_("match": "a.*", "pack_preset": "P")_"),
         R"_({"name": "P", "purchase_order": "12", "attachments": [{"id": "a", "doc_name": "A"}], "letterheads": [{"id": "b", "on_top": true, "file_name": "b.pdf"}]})_"),
     {"warning /pack_presets/0/attachments/0/doc_name: \"doc_name\" is read by nobody and is gone when the "
      "settings are stored | remove it [dropped-key]",
      "warning /pack_presets/0/letterheads/0/file_name: \"file_name\" is read by nobody and is gone when the "
      "settings are stored | remove it [dropped-key]",
      "warning /pack_presets/0/purchase_order: \"purchase_order\" is read by nobody and is gone when the "
      "settings are stored | remove it [dropped-key]"}},
    {"AMissingName",
     partWithField(R"_({"value_extract": "^Ref: (?<VAL>.*)$"})_"),
     {"error /extract_presets/0/zones/0/fields/1: \"name\" is missing: all settings of the document are "
      "refused | add it [missing-key]"}},
    {"AMissingListOfFields",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P", "type": 1, "zones": [{"name": "Z"}]}], "pack_presets": [{"name": "P"}]})_",
     {"error /extract_presets/0/zones/0: \"fields\" is missing: all settings of the document are refused | "
      "add it [missing-key]"}},
    {"ValuesOfTheWrongType",
     partWithField(
         R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$", "obligatory": "true", "priority": "1", "width": 1.5, "value_match": 5})_"),
     {"error /extract_presets/0/zones/0/fields/1/obligatory: a value of type string reads as false without a "
      "word | write true or false [wrong-type]",
      "error /extract_presets/0/zones/0/fields/1/priority: a value of type string reads as 0 without a word "
      "| write an integer [wrong-type]",
      "error /extract_presets/0/zones/0/fields/1/value_match: a value of type integer reads as the empty "
      "text without a word | write a text in quotes [wrong-type]",
      "error /extract_presets/0/zones/0/fields/1/width: a value of type float reads as 0 without a word | "
      "write an integer [wrong-type]"}},
    {"ValuesOfTheWrongTypeInAPreset",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P", "type": 1, "max_line_distance": "2", "skip_images": 1, "name": null}], "pack_presets": [{"name": "P"}]})_",
     {"error /extract_presets/0/max_line_distance: a value of type string reads as 1.8 without a word | "
      "write a number [wrong-type]",
      "error /extract_presets/0/name: a value of type null reads as the empty text without a word | write a "
      "text in quotes [wrong-type]",
      "error /extract_presets/0/skip_images: a value of type integer reads as false without a word | write "
      "true or false [wrong-type]"}},
    {"RefusedTypes",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P", "type": 1, "zones": {}}, 7], "pack_presets": [{"name": "P", "delay": {"week_days": [1, "2"], "mins": 3}, "attachments": [4], "letterheads": [{"id": "b", "on_top": true, "which_attachments": [1]}]}]})_",
     {"error /extract_presets/0/zones: a value of type object is refused, and all settings of the document "
      "with it | write a list [...] [refused-type]",
      "error /extract_presets/1: a value of type integer is refused, and all settings of the document with "
      "it | write an object {...} [refused-type]",
      "error /pack_presets/0/attachments/0: a value of type integer is refused, and all settings of the "
      "document with it | write an object {...}, or the id as a text [refused-type]",
      "error /pack_presets/0/delay/mins: a value of type integer is refused, and all settings of the "
      "document with it | write a list of integers [refused-type]",
      "error /pack_presets/0/delay/week_days/1: a value of type string is refused, and all settings of the "
      "document with it | write an integer [refused-type]",
      "error /pack_presets/0/letterheads/0/which_attachments/0: a value of type integer is refused, and all "
      "settings of the document with it | write a text in quotes [refused-type]"}},
    {"RefusedTypesInOtherParts",
     R"_({"app": {"max_letter_sheets": "9", "print_area": {"inh": true, "v": 4}}, "po": {"expiry": 1.5}, "deps": {"vals": ["Sales", {"descrip": "x"}, 3]}, "profiles": {"vals": [{"name": 3}, "fast"]}, "inet": []})_",
     {"error /app/max_letter_sheets: a value of type string is refused, and all settings of the document "
      "with it | write an integer [refused-type]",
      "error /app/print_area/v: a value of type integer is refused, and all settings of the document with it "
      "| write an object {...} [refused-type]",
      "error /deps/vals/1: \"name\" is missing: all settings of the document are refused | add it "
      "[missing-key]",
      "error /deps/vals/2: a value of type integer is refused, and all settings of the document with it | "
      "write an object {...}, or the id as a text [refused-type]",
      "error /inet: a value of type array is refused, and all settings of the document with it | write an "
      "object {...} [refused-type]",
      "error /po/expiry: a value of type float is refused, and all settings of the document with it | write "
      "an integer [refused-type]",
      "error /profiles/vals/0/name: a value of type integer is refused, and all settings of the document "
      "with it | write a text in quotes [refused-type]",
      "error /profiles/vals/1: a value of type string is refused, and all settings of the document with it | "
      "write an object {...} [refused-type]"}},
    {"NumbersThatDoNotFit",
     partWithField(
         R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$", "mark": 4294967297, "width": -1})_"),
     {"error /extract_presets/0/zones/0/fields/1/mark: 4294967297 does not fit and reads as 1 | write a "
      "number from -2147483648 to 2147483647 [cut-number]",
      "error /extract_presets/0/zones/0/fields/1/width: -1 does not fit and reads as 18446744073709551615 | "
      "write a number from 0 to 9223372036854775807 [cut-number]"}},
    {"AnUnsignedNumberBelowZero",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P", "type": 1, "ocr_test_pages": -1}], "pack_presets": [{"name": "P"}]})_",
     {"error /extract_presets/0/ocr_test_pages: -1 does not fit and reads as 4294967295 | write a number "
      "from 0 to 4294967295 [cut-number]",
      "warning /extract_presets/0/ocr_test_pages: \"ocr_test_pages\" is kept and handed on, and "
      "changes nothing here | remove it unless another program reads it [carried-only]"}},
    {"NumbersWithoutAMeaning",
     partWithField(
         R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>.*)$", "value_type": 4, "ignore_on_group": 7})_"),
     {"warning /extract_presets/0/zones/0/fields/1/ignore_on_group: 7 has no meaning: letters with other "
      "values are grouped, or not, without a value being kept for them | write a number from -1 to 6 "
      "[unknown-number]",
      "warning /extract_presets/0/zones/0/fields/1/value_type: 4 has no meaning: the value is taken for a "
      "text | write a number from 0 to 3 [unknown-number]"}},
    {"ATypeOfPresetsThatIsNone",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P", "type": 2}], "pack_presets": [{"name": "P"}]})_",
     {"warning /extract_presets/0/type: 2 has no meaning: the preset is neither for letters nor for "
      "attachments | write a number from 0 to 1 [unknown-number]"}},
    {"AnEmptyExpression",
     partOf(preset(R"_("pack_preset": "P")_")),
     {"error /extract_presets/0: an empty expression fits no document's name: the preset is never used | "
      "write an expression that fits whole names, such as \"invoice.*\\.pdf\" [empty-match]"}},
    {"AnExpressionWithoutAnEnding",
     partOf(preset(R"_("match": "invoice \\d+", "pack_preset": "P")_")),
     {"warning /extract_presets/0/match: the expression must fit the whole name, and fits only names without "
      "an ending, such as \"invoice 1\" | let it go on to the end of the name: \"invoice \\d+.*\" "
      "[match-without-ending]"}},
    {"APresetBehindACatchAll",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_") + ", " +
            preset(R"_("match": "invoice.*", "pack_preset": "P")_")),
     {"error /extract_presets/1: no document reaches this preset: \".*\" at /extract_presets/0 fits all its "
      "names, and is tried first because it stands in front | give this one an \"order\" below 0 or the "
      "other one a greater \"order\", or remove this one [unreachable-preset]"}},
    {"APresetBehindAnExpressionThatFitsEverything",
     partOf(preset(R"_("name": "All", "match": "^(.+)$", "pack_preset": "P")_") + ", " +
            preset(R"_("match": "invoice.*", "pack_preset": "P")_")),
     {"error /extract_presets/1: no document reaches this preset: \"All\" (\"^(.+)$\") at /extract_presets/0 "
      "fits all its names, and is tried first because it stands in front | give this one an \"order\" below "
      "0 or the other one a greater \"order\", or remove this one [unreachable-preset]"}},
    {"APresetBehindAnEqualExpression",
     partOf(preset(R"_("match": "a\\d.*", "pack_preset": "P")_") + ", " +
            preset(R"_("match": "a\\d.*", "pack_preset": "P")_")),
     {"error /extract_presets/1: no document reaches this preset: \"a\\d.*\" at /extract_presets/0 fits all "
      "its names, and is tried first because it stands in front | give this one an \"order\" below 0 or the "
      "other one a greater \"order\", or remove this one [unreachable-preset]"}},
    {"APresetForOneNameBehindAnotherThatFitsIt",
     partOf(preset(R"_("match": "invoice.*", "pack_preset": "P")_") + ", " +
            preset(R"_("match": "Invoice \\(1\\)\\.pdf", "pack_preset": "P")_")),
     {"error /extract_presets/1: no document reaches this preset: \"invoice.*\" at /extract_presets/0 fits "
      "all its names, and is tried first because it stands in front | give this one an \"order\" below 0 or "
      "the other one a greater \"order\", or remove this one [unreachable-preset]"}},
    {"APresetThatItsOrderPutsBehindACatchAll",
     partOf(preset(R"_("match": "invoice.*", "order": 5, "pack_preset": "P")_") + ", " +
            preset(R"_("match": ".*", "pack_preset": "P")_")),
     {"error /extract_presets/0: no document reaches this preset: \".*\" at /extract_presets/1 fits all its "
      "names, and is tried first because its \"order\" is missing, which counts as 0 (here it is 5) | give "
      "this one an \"order\" below 0 or the other one a greater \"order\", or remove this one "
      "[unreachable-preset]"}},
    {"APresetThatSeemsShadowed",
     partOf(preset(R"_("match": "invoice.*", "order": 1, "pack_preset": "P")_") + ", " +
            preset(R"_("match": "invoice \\d{4}-\\d+\\.pdf", "order": 2, "pack_preset": "P")_")),
     {"warning /extract_presets/1: it seems that no document reaches this preset: \"invoice.*\" at "
      "/extract_presets/0 fits all names that were tried, such as \"invoice 1101-1101.pdf\", and is tried "
      "first because its \"order\" is 1 (here it is 2) | give this one an \"order\" below 1 or the other one "
      "a greater \"order\", or remove this one [shadowed-preset]"}},
    {"PresetsOfOneOrderForTheSameNames",
     partOf(preset(R"_("match": "inv.*", "order": 3, "pack_preset": "P")_") + ", " +
            preset(R"_("match": ".*ice\\.pdf", "order": 3, "pack_preset": "P")_")),
     {"warning /extract_presets/1: \"inv.*\" at /extract_presets/0 has the same \"order\" 3 and fits the "
      "same names, such as \"invice.pdf\": their sequence in the document decides | give the one that is to "
      "be tried first a smaller \"order\" [order-tie]"}},
    {"TheLastOrder",
     partOf(preset(R"_("match": "invoice.*", "order": 2147483647, "pack_preset": "P")_")),
     {"warning /extract_presets/0/order: 2147483647 is the last order there is, which a preset has that was "
      "never given one: nothing can be tried after it | give it an \"order\" of its own [last-order]"}},
    {"NothingInPresetsThatAgeOut",
     partOf(preset(R"_("match": "a\\.pdf", "order": 2147483647, "last_used": 1, "pack_preset": "P")_") +
            ", " +
            preset(R"_("match": "b\\.pdf", "order": 2147483647, "last_used": 1, "pack_preset": "P")_")),
     {}},
    {"ATombstone",
     R"_({"extract_presets": [{"match": "a.*", "erase_me": true}], "pack_presets": []})_",
     {"error /extract_presets/0/erase_me: the preset is marked for deletion and is tried all the same: "
      "documents that it fits reach no other | take the preset out of the document [erased-preset-matches]"}},
    {"APackPresetThatIsMissing",
     partOf(preset(R"_("match": "a.*", "pack_preset": "bils")_"),
            R"_({"name": "Bills"}, {"name": "Offers"})_"),
     {"error /extract_presets/0/pack_preset: there is no pack preset \"bils\": every document that this "
      "preset fits fails | add a pack preset of that name, or name one that is there: \"Bills\" "
      "[pack-preset-missing]",
      "warning /pack_presets/0: no extraction preset names \"Bills\": it is never used | name it in the "
      "\"pack_preset\" of an extraction preset, or remove it [pack-preset-unused]",
      "warning /pack_presets/1: no extraction preset names \"Offers\": it is never used | name it in the "
      "\"pack_preset\" of an extraction preset, or remove it [pack-preset-unused]"}},
    {"NoPackPresetNamed",
     partOf(preset(R"_("match": "a.*")_"), R"_()_"),
     {"error /extract_presets/0: the preset names no pack preset: every document that it fits fails | add "
      "\"pack_preset\" with the name of one that is there: \"GLOBAL\" [pack-preset-not-named]"}},
    {"TwoPackPresetsOfOneName",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P")_"),
            R"_({"name": "P"}, {"name": "P", "duplex": true})_"),
     {"error /pack_presets/1: the pack preset \"P\" at /pack_presets/0 stands in front of it and has the "
      "same name: this one is never used | give it another name, or remove it [pack-preset-twice]"}},
    {"APackPresetThatNobodyNames",
     partOf(
         preset(R"_("match": "a.*", "pack_preset": "P")_"),
         R"_({"name": "P"}, {"name": "Old"}, {"name": "GLOBAL"}, {"inh": true, "v": {"name": "Parent"}})_"),
     {"warning /pack_presets/1: no extraction preset names \"Old\": it is never used | name it in the "
      "\"pack_preset\" of an extraction preset, or remove it [pack-preset-unused]"}},
    {"APackPresetThatIsMarkedAndUsed",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P")_"), R"_({"name": "P", "erase_me": true})_"),
     {"error /pack_presets/0/erase_me: the pack preset is marked for deletion and is used all the same, by "
      "the extraction preset at /extract_presets/0 | name another one there, then take this one out of the "
      "document [erased-pack-preset-used]"}},
    {"ProcessModes",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P")_"),
            R"_({"name": "P", "process_mode": 10, "process_mode_client": 4})_"),
     {"error /pack_presets/0/process_mode: 10 is refused, and all settings of the document with it: the bits "
      "2 and 8 exclude each other | write 0, or a number up to 255 with one of the bits 1, 2, 8 and 128 "
      "[process-mode-refused]",
      "error /pack_presets/0/process_mode_client: 4 is refused, and all settings of the document with it: it "
      "has none of the bits 1, 2 and 16 | write 0, or a number up to 255 with one of the bits 1, 2 and 16 "
      "[process-mode-refused]",
      "warning /pack_presets/0/process_mode_client: \"process_mode_client\" is kept and handed on, and "
      "changes nothing here | remove it unless another program reads it [carried-only]"}},
    {"AProcessModeOfMoreThanEightBits",
     partOf(preset(R"_("match": "a.*", "pack_preset": "P")_"), R"_({"name": "P", "process_mode": 256})_"),
     {"error /pack_presets/0/process_mode: 256 is refused, and all settings of the document with it: it has "
      "more than eight bits | write 0, or a number up to 255 with one of the bits 1, 2, 8 and 128 "
      "[process-mode-refused]"}},
    {"ADelayThatNeverEnds",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_"),
            R"_({"name": "P", "delay": {"week_days": [1, 9]}})_"),
     {"error /pack_presets/0/delay: the delay never ends, and no mailing goes out by this preset: 9 in "
      "\"week_days\", "
      "0 to 6 possible | write days of the week from 0 (Sunday) to 6, days of the month from 1 to 31 and "
      "minutes of "
      "the day from 0 to 1439 that come together within 400 days [delay-impossible]"}},
    {"ADelayWithoutASlotForYears",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_"), R"_({"name": "P", "delay": {"count": 401}})_"),
     {"error /pack_presets/0/delay: the delay never ends, and no mailing goes out by this preset: slot 401 "
      "is not "
      "reached within 400 days | write days of the week from 0 (Sunday) to 6, days of the month from 1 to 31 "
      "and "
      "minutes of the day from 0 to 1439 that come together within 400 days [delay-impossible]"}},
    {"NothingInADelayThatEnds",
     partOf(
         preset(R"_("match": ".*", "pack_preset": "P")_"),
         R"_({"name": "P", "delay": {"week_days": [1], "mins": [480]}, "customer_email": "ada@example.com"})_"),
     {}},
    {"AnAddressThatIsNone",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_"), R"_({"name": "P", "customer_email": "ada@"})_"),
     {"error /pack_presets/0/customer_email: \"ada@\" is no e-mail address, and no mailing goes out by this "
      "preset | "
      "write one address, such as name@example.com [email-malformed]"}},
    {"AConfirmationToNobody",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_"),
            R"_({"name": "P", "confirmation_email": true})_"),
     {"warning /pack_presets/0/confirmation_email: nobody gets an e-mail when the mailing is handed over: "
      "the pack preset does not say who is to get it | write the sender's address as \"customer_email\", or "
      "remove it [confirmation-not-sent]"}},
    {"NothingInAConfirmationToSomebody",
     partOf(preset(R"_("match": ".*", "pack_preset": "P")_"),
            R"_({"name": "P", "confirmation_email": true, "customer_email": "ada@example.com"})_"),
     {}},
    {"ALetterheadWithoutFlags",
     partOf(
         preset(R"_("match": "a.*", "pack_preset": "P")_"),
         R"_({"name": "P", "letterheads": [{"id": "b", "which_attachments": ["a"], "margin": 4}, {"id": "c", "margin": 4, "on_top": true}]})_"),
     {"warning /pack_presets/0/letterheads/0: a letterhead without flags is stored as its id alone, without "
      "\"which_attachments\", \"margin\" | set one of \"skip_letters\", \"skip_attachments\", "
      "\"repeat_last_page\", \"apply_first_grouped_only\" and \"on_top\" to true [letterhead-loses-keys]"}},
    {"ABrokenExpression",
     R"_({"extract_presets": [{"match": "invoice(.*", "pack_preset": "P", "type": 1}], "pack_presets": [{"name": "P"}]})_",
     {"error /extract_presets/0/match: the pattern is broken at character 11 (Unmatched marking parenthesis "
      "( or \\(): every document whose name is tried on it fails | correct the pattern [broken-pattern]"}},
    {"BrokenPatterns",
     partWithField(R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>.*$", "value_match": "[a"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extract: the pattern is broken at character 17 "
      "(Unmatched marking parenthesis ( or \\(): no document that gets this preset can be read | correct the "
      "pattern [broken-pattern]",
      "error /extract_presets/0/zones/0/fields/1/value_match: the pattern is broken at character 3 "
      "(Unmatched [ or [^ in character class declaration): no document that gets this preset can be read | "
      "correct the pattern [broken-pattern]"}},
    {"AnExpressionWithACommentBehindAPossessiveRepeat",
     R"_({"extract_presets": [{"match": "a?+(?#why)b", "pack_preset": "P", "type": 1}], "pack_presets": [{"name": "P"}]})_",
     {"error /extract_presets/0/match: the pattern is broken at character 4 (A comment stands behind a "
      "possessive repeat): every document whose name is tried on it fails | correct the pattern "
      "[broken-pattern]"}},
    {"PatternsWithACommentBehindAPossessiveRepeat",
     partWithField(
         R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>a{2}+(?#why)b)$", "value_match": "a++ (?#why)b"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extract: the pattern is broken at character 19 (A "
      "comment stands behind a possessive repeat): no document that gets this preset can be read | correct "
      "the pattern [broken-pattern]",
      "error /extract_presets/0/zones/0/fields/1/value_match: the pattern is broken at character 5 (A "
      "comment stands behind a possessive repeat): no document that gets this preset can be read | correct "
      "the pattern [broken-pattern]"}},
    {"PatternsThatRunAway",
     partWithField(
         R"_({"name": "ref", "value_extract": "^Ref: (?<VAL>(\\w+\\s?)*);$", "value_match": "(a|a)*b"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extract: the pattern runs away on a text such as "
      "\"Ref: 1111111111111111111...\": in such a letter the field is not found and yields its default, or "
      "nothing | repeat nothing that is repeated inside, and let neighbouring repetitions take different "
      "characters [runaway-pattern]",
      "error /extract_presets/0/zones/0/fields/1/value_match: the pattern runs away on a text such as "
      "\"aaaaaaaaaaaaaaaaaaaaaaaa...\": documents with such a value fail | repeat nothing that is repeated "
      "inside, and let neighbouring repetitions take different characters [runaway-pattern]"}},
    {"APatternThatIsSlow",
     partWithField(R"_({"name": "ref", "value_extract": ".*a.*a.*a.*(?<VAL>b)"})_"),
     {"warning /extract_presets/0/zones/0/fields/1/value_extract: the pattern is slow on a line of 1,000 "
      "characters such as \"aaaaaaaaaaaaaaaaaaaaaaaa...\": twice the length takes eight times as long, or "
      "more | repeat nothing that is repeated inside, and let neighbouring repetitions take different "
      "characters [slow-pattern]"}},
    {"APatternWithoutItsGroup",
     partWithField(R"_({"name": "ref", "value_extract": "^Ref: (?<val>.*)$"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extract: the pattern has no group VAL, so that it "
      "finds nothing: the field yields its default, or nothing | put what is the value into (?<VAL>...) "
      "[value-group-missing]"}},
    {"APatternInDecomposedCharacters",
     partWithField(R"_({"name": "ref", "value_extract": "^Gebühr: (?<VAL>.*)$"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_extract: the pattern has accents as characters of "
      "their own, which a document's text never has: it does not fit | write the pattern in composed "
      "characters (NFC) [pattern-not-composed]"}},
    {"AZoneOffThePage",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 21500, "top": 30000, "right": 29000, "bottom": 31000})_"))),
     {"error /extract_presets/0/zones/0/location: the zone lies off the page (left 21500, top 30000, right "
      "29000, bottom 31000): its fields are never found | coordinates are in 1/100 mm from the top left "
      "corner; an A4 page is 21000 wide and 29700 high [zone-off-page]"}},
    {"AZoneBeyondThePage",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 18000, "top": 100, "right": 25000, "bottom": 3000})_"))),
     {"warning /extract_presets/0/zones/0/location: the zone goes beyond the edge of an upright page (left "
      "18000, top 100, right 25000, bottom 3000) | coordinates are in 1/100 mm from the top left corner; an "
      "A4 page is 21000 wide and 29700 high [zone-beyond-page]"}},
    {"AZoneWithoutAnArea",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 9000, "top": 100, "right": 1000, "bottom": 3000})_"))),
     {"error /extract_presets/0/zones/0/location: the zone has no area (left 9000, top 100, right 1000, "
      "bottom 3000): its fields are never found | \"left\" must be less than \"right\", and \"top\" less "
      "than \"bottom\" [zone-empty]"}},
    {"AZoneInMillimetres",
     partOf(
         presetWith(zoneWith("", R"_(, "location": {"left": 20, "top": 45, "right": 110, "bottom": 90})_"))),
     {"warning /extract_presets/0/zones/0/location: the zone is 0.9 mm wide and 0.45 mm high: hardly a word "
      "lies in it | coordinates are in 1/100 mm from the top left corner; an A4 page is 21000 wide and 29700 "
      "high [zone-tiny]"}},
    {"ZonesThatOverlap",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 9000})_") +
         R"_(, {"name": "Y", "fields": [{"name": "ref", "value_extract": "(?<VAL>.+)"}], "location": {"left": 10000, "top": 8550, "right": 20000, "bottom": 12000}})_")),
     {"warning /extract_presets/0/zones/1/location: the zone shares 10 mm by 4.5 mm with zone \"Z\" at "
      "/extract_presets/0/zones/0: what stands there is read in both | move the zones apart "
      "[zones-overlap]"}},
    {"NothingInZonesThatOverlapWhereEachFieldLooksForItsOwnLine",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 9000})_") +
         R"_(, {"name": "Y", "fields": [{"name": "ref", "value_extract": "^Ref: (?<VAL>.+)"}], "location": {"left": 10000, "top": 8550, "right": 20000, "bottom": 12000}})_")),
     {}},
    {"NothingInAnAddressWithinALargerZone",
     partOf(presetWith(
         zoneWith("", R"_(, "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700})_") +
         R"_(, {"name": "Y", "fields": [{"name": "any", "value_extract": "\\A(?<VAL>(.|\\n)*)\\z"}], "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 9000}})_")),
     {}},
    {"ZonesAtOnePoint",
     partOf(presetWith(
         zoneWith("") +
         R"_(, {"name": "Y", "fields": [{"name": "ref", "value_extract": "(?<VAL>.+)"}], "most_probable_point": {"x": 4500, "y": 6200}})_")),
     {"warning /extract_presets/0/zones/1: the zone takes the block of text nearest to 4500, 6200, as does "
      "zone \"Z\" at /extract_presets/0/zones/0: both read the same text | give one of them a \"location\" "
      "or another \"most_probable_point\" [zones-at-one-point]"}},
    {"APointOffThePage",
     partOf(presetWith(zoneWith("", R"_(, "most_probable_point": {"x": 45000, "y": 6200})_"))),
     {"error /extract_presets/0/zones/0/most_probable_point: the point 45000, 6200 lies off the page | "
      "coordinates are in 1/100 mm from the top left corner; an A4 page is 21000 wide and 29700 high "
      "[point-off-page]"}},
    {"AZoneWithoutFields",
     partOf(presetWith(zoneWith("") +
                       R"_(, {"name": "Y", "fields": [], "most_probable_point": {"x": 9000, "y": 9000}})_")),
     {"warning /extract_presets/0/zones/1: the zone has no fields: nothing is read from it | add fields, or "
      "remove the zone [zone-without-fields]"}},
    {"TwoFieldsOfOneName",
     partWithField(R"_({"name": "to", "default_value": "x"})_"),
     {"error /extract_presets/0/zones/0/fields/1/name: the field at /extract_presets/0/zones/0/fields/0 is "
      "called \"to\" too: a letter has one value of a name, the one that is found first | give it another "
      "name, or remove it [field-name-twice]"}},
    {"TwoAddressesOfOnePriority",
     partWithField(
         R"_({"name": "post", "value_extract": "(?<VAL>.+)", "priority": 1, "send_to_server": true})_"),
     {"error /extract_presets/0/zones/0/fields/1/priority: the recipient address \"to\" at "
      "/extract_presets/0/zones/0/fields/0 has the same priority 1: a letter with both goes to the one that "
      "was found first | give it another \"priority\" [field-priority-twice]"}},
    {"AnAddressThatIsNotSent",
     partWithField(R"_({"name": "fax", "value_extract": "(?<VAL>.+)", "priority": 3})_"),
     {"error /extract_presets/0/zones/0/fields/1: the recipient address does not go to the server, so it "
      "never counts: a letter with no other cannot go out | set \"send_to_server\" to true "
      "[address-not-sent]"}},
    {"APresetWithoutAnAddress",
     R"_({"extract_presets": [{"match": "a.*", "pack_preset": "P"}], "pack_presets": [{"name": "P"}]})_",
     {"warning /extract_presets/0: no field of the preset is a recipient address: no letter in these "
      "documents can go out | give a field a \"priority\" above 0, and set its \"send_to_server\" to true "
      "[no-address]"}},
    {"AFieldThatIsNeverFound",
     partWithField(R"_({"name": "ref"})_"),
     {"error /extract_presets/0/zones/0/fields/1: the field has neither a pattern nor a default: it never "
      "has a value | add \"value_extract\" with the value in (?<VAL>...) [never-found]"}},
    {"AnAddressInCapitals",
     partWithField(R"_({"name": "Notify", "value_extract": "(?<VAL>.+)", "priority": -1})_"),
     {"warning /extract_presets/0/zones/0/fields/1/name: the name of an address is read in lower case: the "
      "field is called \"notify\" | write \"notify\" [name-lowered]"}},
    {"AWidthInMillimetres",
     partWithField(R"_({"name": "ref", "value_extract": "(?<VAL>.+)", "width": 140})_"),
     {"warning /extract_presets/0/zones/0/fields/1/width: what is wider than 1.4 mm is not taken: hardly a "
      "word is so narrow | \"width\" is in 1/100 mm: 140 mm are 14000 [width-tiny]"}},
    {"AMarkThatOverrulesTheType",
     partWithField(R"_({"name": "single", "mark": 2, "value_type": 3, "default_value": 0})_"),
     {"warning /extract_presets/0/zones/0/fields/1/value_type: a field with \"mark\" 2 has an integer "
      "whatever its \"value_type\" is | remove \"value_type\" [type-overruled]"}},
    {"ASumOfReals",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 2, "value_min": 0, "ignore_on_group": 1})_"),
     {"error /extract_presets/0/zones/0/fields/1/ignore_on_group: when letters are grouped, real numbers are "
      "not put together: two of them give 2.0, whatever they are | use integers, such as cents "
      "(\"value_type\" 1) [reals-not-merged]"}},
    {"TheGreaterOfReals",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 2, "value_min": 0, "ignore_on_group": 3})_"),
     {"error /extract_presets/0/zones/0/fields/1/ignore_on_group: when letters are grouped, real numbers are "
      "not put together: two of them give 1.0, whatever they are | use integers, such as cents "
      "(\"value_type\" 1) [reals-not-merged]"}},
    {"ADefaultOfAnAddress",
     partWithField(
         R"_({"name": "fax", "value_extract": "(?<VAL>.+)", "priority": 3, "send_to_server": true, "default_value": "0"})_"),
     {"warning /extract_presets/0/zones/0/fields/1/default_value: a recipient address has no default: this "
      "one is dropped | remove it [default-dropped]"}},
    {"ADefaultThatCannotBeRead",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 1, "value_min": 0, "default_value": "none"})_"),
     {"error /extract_presets/0/zones/0/fields/1/default_value: \"none\" cannot be read as an integer: the "
      "field has no default | write an integer [default-ignored]"}},
    {"ADefaultBelowTheMinimum",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 1, "value_min": 1, "default_value": 0})_"),
     {"error /extract_presets/0/zones/0/fields/1/default_value: the field's own rules refuse 0, but a letter "
      "goes out with it, since defaults are not tested: it is below the least value 1 | change the default, "
      "or the rule [default-refused]"}},
    {"ADefaultAboveTheMaximum",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 2, "value_min": 0, "value_max": 9.5, "default_value": "12.5"})_"),
     {"error /extract_presets/0/zones/0/fields/1/default_value: the field's own rules refuse \"12.5\", but a "
      "letter goes out with it, since defaults are not tested: it is above the greatest value 9.5 | change "
      "the default, or the rule [default-refused]"}},
    {"ADefaultThatDoesNotFitItsPattern",
     partWithField(
         R"_({"name": "ref", "value_extract": "(?<VAL>.+)", "value_match": "\\d+", "default_value": "none"})_"),
     {"error /extract_presets/0/zones/0/fields/1/default_value: the field's own rules refuse \"none\", but a "
      "letter goes out with it, since defaults are not tested: it does not fit \"\\d+\" | change the "
      "default, or the rule [default-refused]"}},
    {"LimitsOfAText",
     partWithField(R"_({"name": "ref", "value_extract": "(?<VAL>.+)", "value_max": 72})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_max: 72 is not read as a limit of a text: there is "
      "none | write a \"value_match\" instead, or another \"value_type\" [limit-ignored]"}},
    {"LimitsThatCannotBeRead",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 2, "value_min": 0, "value_max": "a lot"})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_max: \"a lot\" is not read as a limit of a number: "
      "there is none | write a number [limit-ignored]"}},
    {"ALimitThatIsCut",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 1, "value_min": 1.9})_"),
     {"warning /extract_presets/0/zones/0/fields/1/value_min: the limit of an integer is cut: 1.9 reads as 1 "
      "| write an integer [limit-cut]"}},
    {"LimitsThatCross",
     partWithField(
         R"_({"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 1, "value_min": 10, "value_max": 5})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_min: the least value 10 is above the greatest value "
      "5: every value is refused | exchange \"value_min\" and \"value_max\" [limits-crossed]"}},
    {"ADateWithoutItsYear",
     partWithField(R"_({"name": "due", "value_extract": "(?<VAL>.+)", "value_type": 3})_"),
     {"warning /extract_presets/0/zones/0/fields/1: a date without a year, such as \"05/03\", is taken for a "
      "time before 1970 and passes | set \"value_min\" to 0 [date-without-year]"}},
    {"ADateWithoutItsYearInAPatternOfItsOwn",
     partWithField(
         R"_({"name": "due", "value_extract": "(?<VAL>.+)", "value_type": 3, "value_match": "(?<day>\\d\\d?)\\. (?<month>[A-Z][a-z]+)"})_"),
     {"warning /extract_presets/0/zones/0/fields/1: a date without a year, such as \"05. Mar\", is taken for "
      "a time before 1970 and passes | set \"value_min\" to 0 [date-without-year]"}},
    {"NothingInADateWithAMinimum",
     partWithField(R"_({"name": "due", "value_extract": "(?<VAL>.+)", "value_type": 3, "value_min": 0})_"),
     {}},
    {"NothingInADateWithItsYear",
     partWithField(
         R"_({"name": "due", "value_extract": "(?<VAL>.+)", "value_type": 3, "value_match": "(?<day>\\d\\d?)/(?<month>\\d\\d?)/(?<year>(19|20)\\d\\d)"})_"),
     {}},
    {"ANumberWithoutAMinimum",
     partWithField(R"_({"name": "cents", "value_extract": "^Total: (?<VAL>[\\d,]+)$", "value_type": 1})_"),
     {"warning /extract_presets/0/zones/0/fields/1: the text \",\" passes as a number, the lowest there is: "
      "-9223372036854775808 | set a \"value_min\", such as 0 [number-without-minimum]"}},
    {"ARealWithoutAMinimum",
     partWithField(R"_({"name": "total", "value_extract": "^Total: (?<VAL>.*)$", "value_type": 2})_"),
     {"warning /extract_presets/0/zones/0/fields/1: the text \" \" passes as a number, the lowest there is: "
      "-1.79769e+308 | set a \"value_min\", such as 0 [number-without-minimum]"}},
    {"ADecimalCommaInAReal",
     partWithField(
         R"_({"name": "total", "value_extract": "^Total: (?<VAL>\\S+)$", "value_type": 2, "value_match": "[\\d.,]+", "value_min": 0})_"),
     {"warning /extract_presets/0/zones/0/fields/1/value_match: a number with a decimal comma, such as "
      "\"1.234,56\", passes and is read as 1.23456: commas are skipped, and reading ends at what is no "
      "number | "
      "say \"decimal\" in the \"reading\" of the pack preset, or let \"value_match\" take a comma only in "
      "front of three digits [decimal-comma]"}},
    {"ADecimalCommaInAnInteger",
     partWithField(
         R"_({"name": "cents", "value_extract": "^Total: (?<VAL>\\d+,\\d\\d)$", "value_type": 1, "value_match": "\\d+,\\d\\d", "value_min": 0})_"),
     {"warning /extract_presets/0/zones/0/fields/1/value_match: a number with a decimal comma, such as "
      "\"1234,56\", passes and is read as 123456: commas are skipped, and reading ends at what is no number "
      "| "
      "say \"decimal\" in the \"reading\" of the pack preset, or let \"value_match\" take a comma only in "
      "front of three digits [decimal-comma]"}},
    {"NothingInARealWhoseCommasSeparateThousands",
     partWithField(
         R"_({"name": "total", "value_extract": "^Total: (?<VAL>.*)$", "value_type": 2, "value_match": "\\d{1,3}(,\\d{3})*(\\.\\d\\d)?", "value_min": 0})_"),
     {}},
    {"NothingInARealThatNoDecimalCommaReaches",
     partWithField(
         R"_({"name": "total", "value_extract": "^Total: (?<VAL>[\\d.]+)$", "value_type": 2, "value_match": ".*", "value_min": 0})_"),
     {}},
    {"NothingInADecimalCommaThatIsReadAsOne",
     partOf(
         presetWith(zoneWith(
             R"_({"name": "total", "value_extract": "^Total: (?<VAL>\\S+)$", "value_type": 2, "value_match": "[\\d.,]+", "value_min": 0})_")),
         R"_({"name": "P", "reading": {"decimal": ",", "grouping": ".", "months": "nl", "zones": {"Z": {"page": "last", "anchor": "^Sum", "column": true}}}})_"),
     {}},
    {"AReadingThatCannotBeUsed",
     partOf(
         presetWith(zoneWith("")),
         R"_({"name": "P", "reading": {"decimal": ".", "grouping": ".'", "months": "Dutch", "zones": {"Z": {"page": 99999, "anchor": "(a+)+b", "colum": true}}}})_"),
     {"error /pack_presets/0/reading/grouping: \".\" is the decimal character too: no document that is sent "
      "by "
      "this pack preset can be read | take it out of one of the two [reading-refused]",
      "error /pack_presets/0/reading/months: is no language whose names of months are known: no document "
      "that is "
      "sent by this pack preset can be read | write its code, such as \"de\", \"fr\" or \"nl\" "
      "[reading-refused]",
      "error /pack_presets/0/reading/zones/Z/anchor: the pattern runs away on a text such as "
      "\"aaaaaaaaaaaaaaaaaaaaaaaa...\": in such a letter the field is not found and yields its default, or "
      "nothing | "
      "repeat nothing that is repeated inside, and let neighbouring repetitions take different characters "
      "[runaway-pattern]",
      "error /pack_presets/0/reading/zones/Z/colum: \"colum\" is no key here: no document that is sent by "
      "this pack "
      "preset can be read | write one of \"page\", \"anchor\", \"column\" [reading-refused]",
      "error /pack_presets/0/reading/zones/Z/page: is no page of a letter: no document that is sent by this "
      "pack "
      "preset can be read | write 1, 2 and so on, \"last\" or \"any\" [reading-refused]"}},
    {"CarriersRulesThatCannotBeUsed",
     partOf(presetWith(zoneWith("")), UNUSABLE_RULES),
     {"error /pack_presets/0/production/address_lines/min: is no integer from 1 to 100: no letter that "
      "is "
      "sent by this pack preset can go out | write one; lengths are in 1/100 mm [production-refused]",
      "error /pack_presets/0/production/clear_zones/0/right: is no integer from -200000 to 200000: no "
      "letter "
      "that is sent by this pack preset can go out | write one; lengths are in 1/100 mm "
      "[production-refused]",
      "error /pack_presets/0/production/postcode: the pattern runs away on a text such as "
      "\"aaaaaaaaaaaaaaaaaaaaaaaa...\": a letter with such an address cannot go out | repeat nothing "
      "that is "
      "repeated inside, and let neighbouring repetitions take different characters [runaway-pattern]",
      "error /pack_presets/0/production/tolerence: \"tolerence\" is no key here: no letter that is sent "
      "by "
      "this pack preset can go out | write one of \"sheet\", \"window\", \"clear_zones\", \"tolerance\", "
      "\"address_lines\", \"postcode\", \"repair\", \"copies\", \"fallback\", \"duplicate_days\" "
      "[production-refused]",
      "error /pack_presets/0/production/window: has no area: it goes from 90 to 1 mm across and from 0 "
      "to 1 mm "
      "down: no letter that is sent by this pack preset can go out | write \"left\" less than \"right\", "
      "and "
      "\"top\" less than \"bottom\" [production-refused]"}},
    {"NothingInACarriersRules", partOf(presetWith(zoneWith("")), USABLE_RULES), {}},
    {"AMisspeltProduction",
     partOf(presetWith(zoneWith("")), R"_({"name": "P", "producton": {}})_"),
     {"error /pack_presets/0/producton: \"producton\" is no known key and changes nothing | write "
      "\"production\" [misspelt-key]"}},
    {"APrintAreaWithoutArea",
     R"_({"app": {"print_area": {"left": 500, "top": 0, "right": 100, "bottom": 100}}})_",
     {"error /app/print_area: the print area has no area (from 5 to 1 mm across and from 0 to 1 mm "
      "down): no "
      "letter can go out | \"left\" must be less than \"right\", and \"top\" less than \"bottom\" "
      "[print-area-empty]"}},
    {"NothingInAPrintAreaThatIsInheritedOrNotSaid",
     R"_({"app": {"print_area": {"inh": true, "v": {"left": 0, "top": 0, "right": 100, "bottom": 100}}}})_",
     {}},
    {"NothingInAPlaceThatAnAnchorTells",
     partOf(
         R"_({"match": "a.*", "pack_preset": "P", "zones": [
             {"name": "Above", "location": {"left": -1000, "top": -2000, "right": 1000, "bottom": -500},
              "fields": [{"name": "email", "priority": 2, "send_to_server": true, "value_extract": "^To: (?<VAL>.*)$"}]}]})_",
         R"_({"name": "P", "reading": {"zones": {"Above": {"anchor": "^Sum:"}}}})_"),
     {}},
    {"NothingInZonesThatLieOnDifferentPages",
     partOf(
         R"_({"match": "a.*", "pack_preset": "P", "zones": [
             {"name": "One", "location": {"left": 1000, "top": 2000, "right": 9000, "bottom": 9000},
              "fields": [{"name": "email", "priority": 2, "send_to_server": true, "value_extract": "^(?<VAL>.*)$"}]},
             {"name": "Two", "location": {"left": 2000, "top": 2000, "right": 9500, "bottom": 9000},
              "fields": [{"name": "two", "value_extract": "^(?<VAL>.*)$"}]}]})_",
         R"_({"name": "P", "reading": {"zones": {"Two": {"page": "last"}}}})_"),
     {}},
    {"AMarkInAZoneOfAnotherPage",
     partOf(
         presetWith(zoneWith(
             R"_({"name": "ref", "mark": 1, "obligatory": true, "value_extract": "^Ref: (?<VAL>\\S+)$"})_")),
         R"_({"name": "P", "reading": {"zones": {"Z": {"page": "any"}}}})_"),
     {"error /extract_presets/0/zones/0/fields/1/mark: the mark begins letters only where their first page "
      "has it, and "
      "\"reading\" puts the zone \"Z\" on another: it separates nothing | move the field to a zone of the "
      "first page, or "
      "remove \"mark\" [reading-mark-elsewhere]"}},
    {"AZoneThatIsReadAndNotThere",
     partOf(presetWith(zoneWith("")),
            R"_({"name": "P", "reading": {"zones": {"z": {"page": 2}, "Other": {}}}})_"),
     {"error /pack_presets/0/reading/zones/Other: no extraction preset that names this pack preset has a "
      "zone "
      "\"Other\": what is said about it changes nothing | write the name of a zone, or remove it "
      "[reading-zone-missing]",
      "error /pack_presets/0/reading/zones/z: no extraction preset that names this pack preset has a zone "
      "\"z\": "
      "what is said about it changes nothing | write \"Z\" [reading-zone-missing]"}},
    {"AReadingAgainstAPattern",
     partOf(
         presetWith(zoneWith(
             R"_({"name": "total", "value_extract": "^Total: (?<VAL>\\S+)$", "value_type": 2, "value_match": "\\d+,\\d\\d", "value_min": 0})_")),
         R"_({"name": "P", "reading": {"decimal": "auto"}})_"),
     {"error /extract_presets/0/zones/0/fields/1/value_match: \"reading\" hands a number on as 1234.56, and "
      "the "
      "pattern fits no such number: every value with decimals is refused | remove \"value_match\", or write "
      "one for "
      "numbers with a decimal point and without separators [reading-against-match]"}},
    {"NothingInANumberThatCannotBeBlank",
     partWithField(R"_({"name": "cents", "value_extract": "^Total: (?<VAL>\\d+)$", "value_type": 1})_"),
     {}},
};

class LintFindings : public testing::TestWithParam<Case> {};

} // namespace

TEST_P(LintFindings, NameTheCause) {
    TimeLimit const limit(60);
    EXPECT_EQ(findingsIn(GetParam().json), GetParam().findings);
}

INSTANTIATE_TEST_SUITE_P(All, LintFindings, testing::ValuesIn(CASES),
                         [](auto const& one) { return one.param.name; });

TEST(LintFindingWords, HaveACaseEach) {
    std::string all;
    for (Case const& c : CASES)
        for (std::string const& finding : c.findings)
            all += finding;
    for (FindingWords const& words : findingWords())
        EXPECT_THAT(all, HasSubstr('[' + std::string(words.id) + ']'));
}

TEST(LintFindingWords, AreDescribed) {
    std::ifstream file(SOURCE_FOLDER "/docs/presets-tools.md");
    std::string const description{std::istreambuf_iterator<char>(file), {}};
    for (FindingWords const& words : findingWords())
        EXPECT_THAT(description, HasSubstr(std::string("| `") + words.id + "` | " + inWords(words.severity)));
}

TEST(LintCommand, PrintsFindingsAndCountsThem) {
    SettingsFile const file(partOf(R"({"match": "a.*", "pack_preset": "p", "type": 1})"));
    Ran const ran = runVlMail({"presets", "lint", file.path()});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(
        ran.out,
        R"(error /extract_presets/0/pack_preset: there is no pack preset "p": every document that this preset fits fails
    add a pack preset of that name, or name one that is there: "P" [pack-preset-missing]
warning /pack_presets/0: no extraction preset names "P": it is never used
    name it in the "pack_preset" of an extraction preset, or remove it [pack-preset-unused]
)" + file.path() +
            ": 1 error, 1 warning\n");
    EXPECT_EQ(ran.err, "");
}

TEST(LintCommand, PrintsOneObjectForMachines) {
    SettingsFile const file(partOf(R"({"match": "a.*", "pack_preset": "P"})"));
    Ran const ran = runVlMail({"presets", "lint", "--json", file.path()});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(
        ran.out,
        R"({"file":")" + file.path() +
            R"(","errors":0,"warnings":1,"findings":[{"severity":"warning","kind":"no-address",)"
            R"("place":"/extract_presets/0",)"
            R"("what":"no field of the preset is a recipient address: no letter in these documents can go out",)"
            R"("advice":"give a field a \"priority\" above 0, and set its \"send_to_server\" to true"}]})"
            "\n");
}

TEST(LintCommand, ListsErrorsFirstEachInTheOrderOfTheDocument) {
    std::string presets;
    for (int i = 0; i < 11; ++i)
        presets += (i ? ", " : "") + std::string(R"({"match": "a)") + std::to_string(i) +
                   R"(x.*", "pack_preset": "Q"})";
    std::vector<std::string> const findings = findingsIn(partOf(presets));
    ASSERT_EQ(findings.size(), 23u);
    EXPECT_THAT(findings[2], testing::StartsWith("error /extract_presets/2/pack_preset: "));
    EXPECT_THAT(findings[10], testing::StartsWith("error /extract_presets/10/pack_preset: "));
    EXPECT_THAT(findings[11], testing::StartsWith("warning /extract_presets/0: "));
    EXPECT_THAT(findings[22], testing::StartsWith("warning /pack_presets/0: "));
}

TEST(LintCommand, GivesPlacesThatArePointersIntoTheDocument) {
    EXPECT_THAT(findingsIn(R"({"app": {"a/b~c": 1}})").front(),
                testing::StartsWith("warning /app/a~1b~0c: "));
    EXPECT_THAT(
        findingsIn(
            R"({"presets": {"extract_presets": [{"inh": true, "v": {"match": "(", "pack_preset": "GLOBAL"}}]}})")
            .front(),
        testing::StartsWith("error /presets/extract_presets/0/v/match: "));
}

TEST(LintCommand, RefusesWhatIsNoDocument) {
    SettingsFile const file("[1]");
    Ran ran = runVlMail({"presets", "lint", file.path()});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.out, "");
    EXPECT_EQ(ran.err, "vlmail: cannot read the settings in \"" + file.path() +
                           "\": JSON error: Wrong type: array. Expected type: object; correct the file there "
                           "[settings-malformed]\n");
    ran = runVlMail({"presets", "lint", file.path() + ".none"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.err,
              "vlmail: " + file.path() + ".none: there is no such file; check the name [file-unreadable]\n");
}

TEST(LintCommand, EndsSoonOnManyHardPatterns) {
    std::string fields;
    for (int i = 0; i < 5; ++i)
        fields += (i ? ", " : "") + std::string(R"_({"name": "f)_") + std::to_string(i) +
                  R"_(", "value_extract": "(?<VAL>((a+)+)+)(b|c)", "value_match": "(.*)*(.+)+x"})_";
    SettingsFile const file(partWithField(fields));
    EXPECT_THAT(runVlMail({"presets", "lint", file.path()}).out, HasSubstr(": 10 errors, 0 warnings"));
}

// In each of them one thing is wrong that people get wrong, and the first line must say which.
TEST(BrokenExamples, HaveTheirCauseInTheFirstLine) {
    struct {
        char const* file;
        char const* firstLine;
    } const cases[] = {
        {"address-not-sent.json",
         "error /presets/extract_presets/1/zones/0/fields/0: the recipient address does not go to the "
         "server, so it never counts: a letter with no other cannot go out"},
        {"bracket-not-closed.json", "error /presets/extract_presets/0/zones/1/fields/0/value_extract: the "
                                    "pattern is broken at character 27 (Unmatched marking parenthesis ( or "
                                    "\\(): no document that gets this preset can be read"},
        {"catch-all-without-order.json",
         "error /presets/extract_presets/0: no document reaches this preset: \"Everything else\" (\".*\") at "
         "/presets/extract_presets/2 fits all its names, and is tried first because its \"order\" is "
         "missing, which counts as 0 (here it is 10)"},
        {"date-without-year.json", "warning /presets/extract_presets/0/zones/1/fields/1: a date without a "
                                   "year, such as \"05/03\", is taken for a time before 1970 and passes"},
        {"default-below-the-minimum.json",
         "error /presets/extract_presets/0/zones/1/fields/2/default_value: the field's own rules refuse 0, "
         "but a letter goes out with it, since defaults are not tested: it is below the least value 1"},
        {"expression-without-ending.json",
         "warning /presets/extract_presets/1/match: the expression must fit the whole name, and fits only "
         "names without an ending, such as \"reminder 1\""},
        {"group-in-lower-case.json",
         "error /presets/extract_presets/0/zones/1/fields/0/value_extract: the pattern has no group VAL, so "
         "that it finds nothing: the field yields its default, or nothing"},
        {"limit-misspelt.json", "error /presets/extract_presets/0/zones/1/fields/2/vale_max: \"vale_max\" is "
                                "no known key and changes nothing"},
        {"pack-preset-in-another-case.json",
         "error /presets/extract_presets/1/pack_preset: there is no pack preset \"reminders\": every "
         "document that this preset fits fails"},
        {"pattern-runs-away.json", "error /presets/extract_presets/0/zones/1/fields/0/value_extract: the "
                                   "pattern runs away on a text such as \"ref: 1111111111111111111...\": in "
                                   "such a letter the field is not found and yields its default, or nothing"},
        {"zone-in-millimetres.json", "warning /presets/extract_presets/0/zones/0/location: the zone is 0.9 "
                                     "mm wide and 0.45 mm high: hardly a word lies in it"},
    };
    for (auto const& [file, firstLine] : cases) {
        Ran const ran = runVlMail({"presets", "lint", std::string(SOURCE_FOLDER "/examples/broken/") + file});
        EXPECT_EQ(ran.out.substr(0, ran.out.find('\n')), firstLine) << file;
    }
}
