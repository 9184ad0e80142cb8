#include "programs/vlmail/workbench/verdict.h"

#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/golden/expectation.h"
#include "programs/vlmail/report/report_file.h"

#include <algorithm>
#include <set>
#include <system_error>
#include <utility>

namespace VlMail::Workbench {
namespace {

using Change = Comparison::Change;
using Value = DocumentVerdict::Value;

std::map<std::string, Value> valuesOf(DocumentReading const& reading) {
    std::map<std::string, Value> values;
    if (!reading.letters)
        return values;
    std::size_t number = 0;
    for (LetterReading const& letter : *reading.letters) {
        std::string const front =
            ++number > 1 || reading.letters->size() > 1 ? "letter " + std::to_string(number) + ", " : "";
        for (auto const& [priority, field] : letter.fields)
            values.emplace(front + field.name(), Value{Base::validUtf8(field.valueToStr()), field.isValid()});
    }
    return values;
}

std::size_t missingIn(DocumentReading const& reading) {
    std::size_t missing = 0;
    if (reading.letters)
        for (LetterReading const& letter : *reading.letters)
            missing += letter.missing.size();
    return missing;
}

GoldenVerdict goldenVerdict(DocumentReading const& reading, std::filesystem::path const& expectation,
                            Cfg::ExtractZones const& definitions) {
    if (reading.failed())
        return {false, false, {"it cannot be read: " + reading.error}};
    try {
        auto differing = differences(readExpectation(Base::readFile(expectation)), reading, definitions);
        return {differing.empty(), false, std::move(differing)};
    } catch (Base::Error const& failure) {
        return {false, true, {"its expectation cannot be used: " + std::string(failure.what())}};
    }
}

json::Value goldenToJson(std::optional<GoldenVerdict> const& golden) {
    if (!golden)
        return json::Value(json_null());
    json::Array differences;
    for (std::string const& difference : golden->differences)
        differences.append(Base::validUtf8(difference));
    return json::Object{{"verdict", golden->isFailed ? "failed"
                                    : golden->isOk   ? "ok"
                                                     : "differs"},
                        {"differences", differences}};
}

/// What became of two documents' likes, counted.
class Balance {
public:
    void count(bool isWon, bool isLost) {
        won_ = won_ || isWon;
        lost_ = lost_ || isLost;
    }
    void say(std::string line) {
        if (comparison_.lines.size() < MOST_LINES)
            comparison_.lines.push_back(std::move(line));
        differs_ = true;
    }
    Comparison take() {
        comparison_.change = lost_      ? Change::Worse
                             : won_     ? Change::Better
                             : differs_ ? Change::Other
                                        : Change::Same;
        return std::move(comparison_);
    }

private:
    static constexpr std::size_t MOST_LINES = 50;

    Comparison comparison_;
    bool won_ = false;
    bool lost_ = false;
    bool differs_ = false;
};

std::string inWords(Value const* value) {
    if (!value)
        return "nothing";
    std::string text = value->text;
    std::replace(text.begin(), text.end(), '\n', '/');
    return text + (value->isValid ? "" : " (invalid)");
}

void compareValues(DocumentVerdict const& before, DocumentVerdict const& after, Balance& balance) {
    std::set<std::string> names;
    for (auto const* values : {&before.values, &after.values})
        for (auto const& [name, value] : *values)
            names.insert(name);
    for (std::string const& name : names) {
        auto const old = before.values.find(name);
        auto const changed = after.values.find(name);
        Value const* const from = old == before.values.end() ? nullptr : &old->second;
        Value const* const to = changed == after.values.end() ? nullptr : &changed->second;
        bool const wasGood = from && from->isValid;
        bool const isGood = to && to->isValid;
        balance.count(isGood && !wasGood, wasGood && !isGood);
        if (wasGood != isGood || inWords(from) != inWords(to))
            balance.say(name + ": " + inWords(from) + " \u2192 " + inWords(to));
    }
}

void compareStates(DocumentVerdict const& before, DocumentVerdict const& after, Balance& balance) {
    std::string const from = Report::stateOf(before.reading);
    std::string const to = Report::stateOf(after.reading);
    if (from != to)
        balance.say(from + " \u2192 " + to);
    balance.count(before.reading.failed() && !after.reading.failed(),
                  !before.reading.failed() && after.reading.failed());
    std::size_t const wereReady = before.readyLetters();
    std::size_t const areReady = after.readyLetters();
    balance.count(areReady > wereReady, areReady < wereReady);
    if (before.reading.extractPreset != after.reading.extractPreset)
        balance.say("read by the preset for " + before.reading.extractPreset + " \u2192 " +
                    after.reading.extractPreset);
}

} // namespace

char const* verdictWord(DocumentReading const& reading) {
    if (reading.failed())
        return "failed";
    if (reading.isAttachment())
        return "attachment";
    return Report::isTrouble(reading) ? "trouble" : "ready";
}

DocumentVerdict verdictOf(DocumentReading reading, std::filesystem::path const& expectation,
                          Cfg::ExtractZones const& definitions) {
    DocumentVerdict verdict{std::move(reading)};
    verdict.values = valuesOf(verdict.reading);
    std::error_code ignored;
    if (std::filesystem::is_regular_file(expectation, ignored))
        verdict.golden = goldenVerdict(verdict.reading, expectation, definitions);
    return verdict;
}

std::size_t DocumentVerdict::readyLetters() const {
    if (!reading.letters)
        return 0;
    return static_cast<std::size_t>(std::ranges::count_if(
        *reading.letters, [](LetterReading const& letter) { return letter.whyNot().empty(); }));
}

json::Object DocumentVerdict::toJson() const {
    auto const found = static_cast<long long>(
        std::ranges::count_if(values, [](auto const& value) { return value.second.isValid; }));
    json::Value const error =
        reading.failed()
            ? json::Value(json::Object{{"code", Base::nameOf(reading.code)}, {"line", reading.error}})
            : json::Value(json_null());
    return {{"verdict", verdictWord(reading)},
            {"says", Report::stateOf(reading)},
            {"error", error},
            {"preset", reading.extractPresetName.empty() ? reading.extractPreset : reading.extractPresetName},
            {"letters", static_cast<long long>(reading.letters ? reading.letters->size() : 0)},
            {"ready", static_cast<long long>(readyLetters())},
            {"found", found},
            {"invalid", static_cast<long long>(values.size()) - found},
            {"missing", static_cast<long long>(missingIn(reading))},
            {"golden", goldenToJson(golden)}};
}

char const* nameOf(Change change) {
    switch (change) {
    case Change::Better:
        return "better";
    case Change::Worse:
        return "worse";
    case Change::Other:
        return "other";
    case Change::Same:
        break;
    }
    return "same";
}

Comparison compare(DocumentVerdict const& before, DocumentVerdict const& after) {
    Balance balance;
    compareStates(before, after, balance);
    compareValues(before, after, balance);
    if (before.golden && after.golden)
        balance.count(after.golden->isOk && !before.golden->isOk, before.golden->isOk && !after.golden->isOk);
    return balance.take();
}

} // namespace VlMail::Workbench
