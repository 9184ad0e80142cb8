#include "programs/reader/joined_search.h"

#include "programs/base/utf8.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;

/// Whether the pattern speaks of the beginning or the end of the zone's text, which a join has not.
bool holdsOnToEnds(std::string const& pattern) {
    for (std::size_t at = pattern.find('\\'); at < pattern.size(); at = pattern.find('\\', at + 2))
        if (at + 1 < pattern.size() && std::string_view("AZz`'G").find(pattern[at + 1]) != std::string::npos)
            return true;
    return false;
}

/// Lines of a zone's text as one line, with a blank between them.
class JoinedText {
public:
    JoinedText(ZoneText const& zone, std::vector<PlacedLine> const& lines, LineJoin const& join)
        : zone_(zone), join_(join) {
        for (std::size_t const line : join.lines) {
            text_ += parts_.empty() ? "" : " ";
            parts_.push_back({lines[line].offset, text_.size(), lines[line].length});
            text_ += std::string_view(zone.text()).substr(lines[line].offset, lines[line].length);
        }
    }

    std::string& text() { return text_; }
    LineJoin const& join() const { return join_; }

    bool isTooLong() const { return Base::characterCount(text_) > MAX_LINE_LENGTH; }

    /// Whether these bytes have something of the first line and of the last.
    bool spans(std::size_t offset, std::size_t length) const {
        return offset < parts_.front().length && offset + length > parts_.back().begin;
    }

    Stretch stretch(std::size_t offset, std::size_t length, std::vector<Box>& boxes) const {
        Stretch all{text_.substr(offset, length), {}, 0};
        for (Part const& part : parts_) {
            std::size_t const from = std::max(offset, part.begin);
            std::size_t const to = std::min(offset + length, part.begin + part.length);
            if (from >= to)
                continue;
            Stretch const one = zone_.stretch(part.inZone + from - part.begin, to - from);
            all.box = boxes.empty() ? one.box : all.box.united(one.box);
            all.width = std::max(all.width, one.width);
            boxes.push_back(one.box);
        }
        return all;
    }

private:
    struct Part {
        std::size_t inZone;
        std::size_t begin;
        std::size_t length;
    };

    ZoneText const& zone_;
    LineJoin const& join_;
    std::string text_;
    std::vector<Part> parts_;
};

/// What the field finds in a join.
struct JoinedHit {
    std::shared_ptr<ExtractedField> value;
    LineJoin join;
    Stretch match;
    std::vector<Box> parts;
};

std::optional<JoinedHit> searchIn(ExtractField const& field, JoinedText& joined, FieldTrace& trace) {
    JoinedHit hit;
    bool isWhole = false;
    auto const measure = [&](std::string&, unsigned long long offset, unsigned long long length) {
        isWhole = joined.spans(offset, length);
        hit.match = joined.stretch(offset, length, hit.parts);
        return static_cast<unsigned long long>(hit.match.width);
    };
    hit.value = field.extractField(joined.text(), measure,
                                   [&](std::string const& reason) { trace.failure = reason; });
    if (!isWhole || !hit.value || hit.value->isValidated())
        return std::nullopt;
    hit.join = joined.join();
    return hit;
}

/// Takes the lines of a join out of the text, the last ones first so that the others stay where they are.
std::string cutLines(LineJoin const& join, std::vector<PlacedLine> const& lines, ZoneText& text) {
    std::string cut;
    std::vector<std::size_t> order = join.lines;
    for (std::size_t const line : order)
        cut += (cut.empty() ? "" : "\n") + text.text().substr(lines[line].offset, lines[line].length);
    std::sort(order.rbegin(), order.rend());
    for (std::size_t const line : order)
        text.cutLines(lines[line].offset, lines[line].length);
    return cut;
}

/// The first hit with a good value, or else the first with a poor one.
std::optional<JoinedHit> bestHit(ExtractField const& field, ZoneText const& text,
                                 std::vector<PlacedLine> const& lines, FieldTrace& trace,
                                 Judge const& judge) {
    std::optional<JoinedHit> best;
    for (LineJoin const& join : joinsOf(lines)) {
        JoinedText joined(text, lines, join);
        if (joined.isTooLong())
            continue;
        std::optional<JoinedHit> hit = searchIn(field, joined, trace);
        if (trace.failure)
            break;
        Worth const worth = hit ? judge(*hit->value) : Worth::None;
        if (worth == Worth::Good)
            return hit;
        if (worth == Worth::Poor && !best)
            best = std::move(hit);
    }
    return best;
}

} // namespace

bool FieldTrace::wantsJoinedLines() const {
    std::string const& pattern = definition->strRegex();
    return definition->priority() == 0 && !pattern.empty() && !match && !failure && !isFound() &&
           !holdsOnToEnds(pattern);
}

std::shared_ptr<ExtractedField> cutJoinedField(ExtractField const& field, ZoneText& text, FieldTrace& trace,
                                               Judge const& judge) {
    std::vector<PlacedLine> const lines = text.placedLines();
    std::optional<JoinedHit> hit = bestHit(field, text, lines, trace, judge);
    if (!hit)
        return nullptr;
    trace.cut = cutLines(hit->join, lines, text);
    trace.match = std::move(hit->match);
    trace.joined = JoinedMatch{hit->join.joint, std::move(hit->parts)};
    trace.rawText = hit->value->rawValue().textOrEmpty();
    return std::move(hit->value);
}

} // namespace Reader
