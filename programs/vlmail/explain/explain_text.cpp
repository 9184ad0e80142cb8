#include "programs/vlmail/explain/explain_text.h"

#include "programs/base/quoting.h"
#include "programs/vlmail/explain/explain.h"
#include "programs/vlmail/explain/words.h"

#include "vlservice/cfg/geometry.h"

#include <map>
#include <ostream>
#include <string>
#include <string_view>

namespace VlMail {

using namespace Explanation;
using Words::excerpt;
using Words::millimetres;

namespace {

constexpr std::size_t MAX_LETTERS = 100;
constexpr std::size_t MAX_LINES = 15;
/// Of a long list of presets so many are shown at either end.
constexpr std::size_t PRESETS_SHOWN = 10;

std::string textOf(json::Object const& object, char const* key) { return object.get(key).textOrEmpty(); }

std::string placeInWords(json::Value const& box) {
    Cfg::Rect const rect(box);
    return "left " + millimetres(rect.left) + ", top " + millimetres(rect.top) + ", right " +
           millimetres(rect.right) + ", bottom " + millimetres(rect.bottom);
}

class Printer {
public:
    explicit Printer(std::ostream& out) : out_(out) {}

    void print(json::Object const& explanation) {
        line(2, "how it was read");
        printPresets(explanation.get(PRESETS).toArray());
        json::Value const pages = explanation.get(PAGES);
        if (!pages)
            return;
        for (json::Value const& page : pages.toArray())
            printPage(page.toObject(), explanation.get(PAGE_COUNT).intOrZero());
    }

private:
    void line(int indent, std::string const& text) {
        out_ << std::string(static_cast<std::size_t>(indent), ' ') << text << '\n';
    }

    void printPresets(json::Array const& steps) {
        line(4, "presets, in the order in which they are tried:");
        for (std::size_t i = 0; i < steps.size(); ++i) {
            if (i == PRESETS_SHOWN && steps.size() > 2 * PRESETS_SHOWN + 1) {
                std::size_t const left = steps.size() - 2 * PRESETS_SHOWN;
                line(6, "... " + std::to_string(left) + " more that do not fit ...");
                i += left;
            }
            printPreset(i + 1, steps.at(i).toObject());
        }
    }

    void printPreset(std::size_t number, json::Object const& step) {
        std::string const name = textOf(step, NAME);
        std::string const answer = textOf(step, ANSWER);
        line(6, std::to_string(number) + ". " + excerpt(textOf(step, MATCH), MAX_LETTERS) +
                    (name.empty() ? "" : " (" + name + ")") + ": " +
                    (answer == ANSWER_FAILED ? "" : answer + ", ") + textOf(step, WHY));
    }

    void printPage(json::Object const& page, long long of) {
        line(4, "page " + std::to_string(page.get(PAGE).toInt()) + " of " + std::to_string(of) + ", " +
                    millimetres(page.get(WIDTH).intOrZero()) + " by " +
                    millimetres(page.get(HEIGHT).intOrZero()) +
                    (page.get(BEGINS_LETTER).isTrue() ? ": a letter begins here" : ": begins no letter"));
        if (json::Value const doubt = page.get(MAY_BEGIN_LETTER))
            line(6, "it may begin a letter all the same: " + textOf(doubt.toObject(), SAYS) + ", at " +
                        placeInWords(doubt.toObject().get(BOX)));
        isLetter_ = page.get(BEGINS_LETTER).isTrue();
        for (json::Value const& zone : page.get(ZONES).toArray())
            printZone(zone.toObject());
    }

    void printZone(json::Object const& zone) {
        line(6, "zone " + Base::inQuotes(textOf(zone, NAME)) + ", " + whereInWords(zone));
        if (zone.get(NOWHERE))
            line(8, textOf(zone, NOWHERE));
        else
            printZoneText(zone);
        for (json::Value const& field : zone.get(FIELDS).toArray())
            printField(field.toObject());
    }

    static std::string whereInWords(json::Object const& zone) {
        std::string words;
        if (long long const page = zone.get(PAGE).intOrZero())
            words += "on page " + std::to_string(page) + ", ";
        if (zone.get(BY_COLUMN).isTrue())
            words += "column by column, ";
        json::Value const anchor = zone.get(ANCHOR);
        if (anchor)
            words += "told from the anchor at left " + millimetres(Cfg::Rect(anchor).left) + ", top " +
                     millimetres(Cfg::Rect(anchor).top) + ": ";
        json::Value const place = zone.get(anchor ? PLACE : LOCATION);
        if (zone.get(LOCATION))
            return words + placeInWords(place);
        Cfg::Rect const moved(place);
        Cfg::Point const point = anchor ? Cfg::Point(moved.left, moved.top) : Cfg::Point(zone.get(POINT));
        return words + "the block nearest to the point " + millimetres(point.x) + ", " + millimetres(point.y);
    }

    void printZoneText(json::Object const& zone) {
        json::Value const box = zone.get(BOX);
        if (!box) {
            line(8, "there is no text in it");
            return;
        }
        line(8, "its text, " + placeInWords(box) + ":");
        std::string const text = textOf(zone, TEXT);
        std::size_t begin = 0;
        for (std::size_t lines = 0; begin <= text.size(); ++lines) {
            if (lines == MAX_LINES) {
                line(8, "| ...");
                return;
            }
            std::size_t const end = std::min(text.find('\n', begin), text.size());
            line(8, "| " + Words::shortened(std::string_view(text).substr(begin, end - begin), MAX_LETTERS));
            begin = end + 1;
        }
    }

    void printField(json::Object const& field) {
        line(8, outcomeInWords(field) + valueInWords(field));
        json::Value const misses = field.get(NEAR_MISSES);
        if (misses)
            printNearMisses(misses.toArray());
        printEvidence(field);
    }

    std::string outcomeInWords(json::Object const& field) const {
        static std::map<std::string, std::string, std::less<>> const WORDS{
            {OUTCOME_FOUND, "found"},
            {OUTCOME_INVALID, "INVALID"},
            {OUTCOME_TOO_WIDE, "TOO WIDE"},
            {OUTCOME_NOT_FOUND, "not found"},
            {OUTCOME_NOT_SEARCHED, "not searched"},
        };
        auto const words = WORDS.find(textOf(field, OUTCOME));
        std::string text = words == WORDS.end() ? std::string() : words->second;
        bool const isMissing = isLetter_ && field.get(OBLIGATORY).isTrue() && !field.get(VALUE);
        if (isMissing)
            text = "MISSING";
        text.resize(std::max<std::size_t>(text.size(), 12), ' ');
        return text + " " + textOf(field, NAME) + (isMissing ? ", which is obligatory" : "");
    }

    static std::string valueInWords(json::Object const& field) {
        std::string text;
        if (field.get(VALUE))
            text += ": " + Words::shortened(textOf(field, SHOWN), MAX_LETTERS);
        if (field.get(IS_DEFAULT).isTrue())
            text += ", by default";
        std::string const says = textOf(field, SAYS);
        if (!says.empty())
            text += "; " + says;
        if (field.get(IS_PASSED_OVER).isTrue())
            text += "; the letter has another value of this name";
        return text;
    }

    void printNearMisses(json::Array const& misses) {
        std::size_t number = 0;
        for (json::Value const& miss : misses)
            line(12, std::to_string(++number) + ". " + textOf(miss.toObject(), SAYS));
    }

    static std::string joinInWords(json::Value const& joined) {
        if (!joined)
            return {};
        bool const isRight = textOf(joined.toObject(), JOINT) == JOINT_RIGHT;
        return std::string(", joined with the line ") + (isRight ? "to the right," : "below,");
    }

    void printEvidence(json::Object const& field) {
        std::string const pattern = textOf(field, PATTERN);
        if (!pattern.empty())
            line(12, "pattern " + excerpt(pattern, MAX_LETTERS));
        std::string const sendersLine = textOf(field, SENDERS_LINE);
        if (!sendersLine.empty())
            line(12, "leaves out " + excerpt(sendersLine, MAX_LETTERS) +
                         ", the sender's: smaller print above the address");
        json::Value const found = field.get(MATCH);
        if (!found)
            return;
        json::Object const& match = found.toObject();
        line(12, "matches " + excerpt(textOf(match, TEXT), MAX_LETTERS) + joinInWords(field.get(JOINED)) +
                     " at " + placeInWords(match.get(BOX)));
        std::string const cut = textOf(field, CUT);
        if (!cut.empty() && cut != textOf(match, TEXT))
            line(12, "takes " + excerpt(cut, MAX_LETTERS) + " out of the zone's text");
    }

    std::ostream& out_;
    /// The page that is printed begins a letter.
    bool isLetter_ = false;
};

} // namespace

void printExplanation(std::ostream& out, json::Object const& explanation) { Printer(out).print(explanation); }

} // namespace VlMail
