#include "programs/reader/letters.h"
#include "programs/base/error.h"

#include <algorithm>
#include <utility>

namespace Reader {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;
using Cfg::ExtractZone;

bool separates(ExtractField const& field) {
    return field.mark() != LetterSeparatorMark::None && field.mark() != LetterSeparatorMark::SingleLetter;
}

template<typename Condition>
bool anyField(Cfg::ExtractZones const& zones, Condition const& condition) {
    return std::any_of(zones.begin(), zones.end(), [&](ExtractZone const& zone) {
        return std::any_of(zone.fields().begin(), zone.fields().end(), condition);
    });
}

bool maySeparateLetters(Cfg::ExtractZones const& zones) {
    return anyField(zones, separates) && !anyField(zones, [](ExtractField const& field) {
               return field.mark() == LetterSeparatorMark::SingleLetter;
           });
}

/// Answers the width of a match, and takes its lines out of the zone unless they are too wide for the field.
ExtractField::Measure measureFor(ExtractField const& field, ZoneText& text, FieldTrace* trace) {
    return [&field, &text, trace](std::string&, unsigned long long offset, unsigned long long length) {
        Stretch stretch = text.stretch(offset, length);
        auto const width = static_cast<unsigned long long>(stretch.width);
        bool const isTooWide = field.maxWidth() != 0 && field.maxWidth() < width;
        std::string cut = isTooWide ? std::string() : text.cutLines(offset, length);
        if (trace) {
            trace->match = std::move(stretch);
            trace->isTooWide = isTooWide;
            trace->cut = std::move(cut);
        }
        return width;
    };
}

/// What one field yields.
struct Yield {
    std::shared_ptr<ExtractedField> value;
    /// The value was read on the page and is not the default.
    bool isFound = false;
};

/// Searches the fields of one page.
class PageSearch {
public:
    PageSearch(Document& document, int page, Cfg::ExtractPreset const& preset, Trace* trace)
        : document_(document), page_(document.page(page)), layout_(layOut(page_, rulesOf(preset))) {
        if (trace)
            trace_ = &trace->pages.emplace_back(PageTrace{page, false, {}});
        for (ExtractZone const& zone : preset.zones())
            search(zone);
    }

    /// A field that separates letters was found.
    bool isMarked() const { return isMarked_; }

    void fill(Letter& letter) {
        if (trace_)
            trace_->beginsLetter = true;
        for (Yield const& yield : yields_)
            letter.fields.emplace(yield.value->priority(), *yield.value);
        letter.missing = std::move(missing_);
    }

private:
    void search(ExtractZone const& zone) {
        ZoneText text = textOf(page_, layout_, zone);
        if (trace_)
            trace_->zones.push_back({&zone, text.text(), text.box(), text.blocks(), {}});
        for (ExtractField const& field : zone.fields())
            search(field, text);
    }

    void search(ExtractField const& field, ZoneText& text) {
        FieldTrace* const trace = trace_ ? &trace_->zones.back().fields.emplace_back() : nullptr;
        Yield yield;
        yield.value = cutField(field, text, trace);
        yield.isFound = yield.value && !yield.value->isValidated();
        if (yield.value)
            validate(field, *yield.value);
        if (trace && yield.value)
            trace->value = std::make_shared<ExtractedField const>(*yield.value);
        isMarked_ = isMarked_ || (yield.isFound && separates(field));
        if (!yield.value && field.mustHave())
            missing_.push_back(field.name());
        if (yield.value)
            take(std::move(yield));
    }

    void validate(ExtractField const& field, ExtractedField& value) const {
        try {
            field.validate(value);
        } catch (std::exception const& failure) {
            throw Base::Error(document_.name() + ": the value of field \"" + field.name() +
                              "\" cannot be validated (" + failure.what() +
                              "); correct the field's value_match");
        }
    }

    /// A letter has one value of a name: the first that was found, or else the first default.
    void take(Yield yield) {
        auto const known = std::find_if(yields_.begin(), yields_.end(), [&](Yield const& other) {
            return other.value->name() == yield.value->name();
        });
        if (known == yields_.end())
            yields_.push_back(std::move(yield));
        else if (yield.isFound && !known->isFound)
            *known = std::move(yield);
    }

    Document& document_;
    Page const& page_;
    Layout const layout_;
    PageTrace* trace_ = nullptr;
    std::vector<Yield> yields_;
    std::vector<std::string> missing_;
    bool isMarked_ = false;
};

} // namespace

std::vector<Letter> readLetters(Document& document, Cfg::ExtractPreset const& preset, Trace* trace) {
    bool const severalLetters = maySeparateLetters(preset.zones());
    int const firstPage = preset.skipFirstPage() ? 2 : 1;
    std::vector<Letter> letters;
    for (int page = firstPage; page <= document.pageCount(); ++page) {
        if (letters.empty() || severalLetters) {
            PageSearch search(document, page, preset, trace);
            if (letters.empty() || search.isMarked())
                search.fill(letters.emplace_back());
        }
        letters.back().pages.push_back(page);
    }
    return letters;
}

std::shared_ptr<ExtractedField> cutField(ExtractField const& field, ZoneText& text, FieldTrace* trace) {
    std::shared_ptr<ExtractedField> value =
        field.extractField(text.searchedText(), measureFor(field, text, trace));
    if (trace) {
        trace->definition = &field;
        if (value && !value->isValidated())
            trace->rawText = value->rawValue().textOrEmpty();
    }
    return value;
}

LayoutRules rulesOf(Cfg::ExtractPreset const& preset) {
    return {preset.maxSpacesBetweenFrags(), preset.maxLineDistance(), preset.spaceAdjustPerc()};
}

ZoneText textOf(Page const& page, Layout const& layout, ExtractZone const& zone) {
    if (!zone.hasLocation())
        return ZoneText::nearest(page, layout, zone.mostProbablePoint());
    Cfg::Rect const& location = zone.location();
    return ZoneText::inside(page, layout, {location.left, location.top, location.right, location.bottom});
}

} // namespace Reader
