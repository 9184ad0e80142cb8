#include "programs/vlmail/workbench/desk.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/reader/layout.h"
#include "programs/reader/letters.h"
#include "programs/reader/lines.h"
#include "programs/vlmail/golden/expectation.h"
#include "programs/vlmail/golden/test_case.h"
#include "programs/vlmail/golden/zones_text.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/report/printed_pages.h"
#include "programs/vlmail/workbench/evaluation.h"
#include "programs/vlmail/workbench/proposal.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <system_error>
#include <vector>

namespace VlMail::Workbench {
namespace {

namespace fs = std::filesystem;

struct Question {
    char const* name;
    Answer (*answer)(Desk& desk, json::Object const& query);
};

/// A member of the desk, whether it changes the desk or not.
template<auto member>
Answer by(Desk& desk, json::Object const& query) {
    return (desk.*member)(query);
}

constexpr std::array QUESTIONS{
    Question{"evaluate", by<&Desk::evaluate>},
    Question{"lint", by<&Desk::lint>},
    Question{"edit", by<&Desk::edit>},
    Question{"picture", by<&Desk::picture>},
    Question{"blocks", by<&Desk::blocks>},
    Question{"verdict", by<&Desk::verdict>},
    Question{"expectation", by<&Desk::expectation>},
    Question{"propose", by<&Desk::propose>},
    Question{"adopt", by<&Desk::adopt>},
};

json::Object brokenToJson(BrokenText const& broken) {
    return {{"line", broken.says}, {"from", toJson(broken.place)}};
}

/// {"broken"} of a text that is no JSON, and the findings of one that is.
json::Object linted(std::optional<BrokenText> const& broken, SettingsInWork* settings) {
    json::Object answer;
    answer.set("broken", broken ? json::Value(brokenToJson(*broken)) : json::Value(json_null()));
    answer.set("lint", settings ? settings->findings() : json::Array());
    return answer;
}

fs::path fileOf(json::Object const& query, fs::path const& folder) {
    return folder / query.get("document").toString();
}

fs::path withPages(fs::path file) {
    if (isZonesText(file))
        throw Base::Error(Base::Code::FileUnsuitable, "a letter as the texts of its zones has no pages");
    return file;
}

int pageOf(json::Object const& query, Reader::Document const& document) {
    long long const page = query.get("page").toInt();
    if (page < 1 || page > document.pageCount())
        throw Base::Error(Base::Code::RequestInvalid, "the document has no page " + std::to_string(page) +
                                                          "; it has " + std::to_string(document.pageCount()));
    return static_cast<int>(page);
}

SettingsText changed(SettingsText const& text, json::Object const& change) {
    std::string const pointer = change.get("pointer").toString();
    if (change.get("remove").isTrue())
        return text.without(pointer);
    json::Value const value = change.get("value");
    if (!value)
        throw Base::Error(Base::Code::RequestInvalid, "a change wants \"value\" or \"remove\"");
    return change.get("insert").isTrue() ? text.withInserted(pointer, value) : text.with(pointer, value);
}

json::Array linesOf(Reader::Page const& page, Reader::Layout const& layout) {
    json::Array lines;
    for (Reader::Line const& line : layout.lines)
        lines.append(json::Object{{"text", Reader::textOf(page, line)}, {"box", toJson(line.box)}});
    return lines;
}

json::Array blocksOf(Reader::Layout const& layout) {
    json::Array blocks;
    for (Reader::Block const& block : layout.blocks)
        blocks.append(toJson(block.box));
    return blocks;
}

} // namespace

Answer Desk::answer(std::string const& what, std::string const& query) {
    return answered([&] {
        json::Object const parameters = json::strToObject(query.data(), query.size());
        inherit(parameters.get(INHERITED).textOrEmpty());
        for (Question const& question : QUESTIONS)
            if (what == question.name)
                return question.answer(*this, parameters);
        return failureOf(404, Base::Code::RequestInvalid,
                         "there is no request " + Base::inQuotes(Base::validUtf8(what)));
    });
}

/// What settings mean depends on it.
void Desk::inherit(std::string const& told) {
    if (told == inheritedText_)
        return;
    auto const parts =
        told.empty()
            ? nullptr
            : std::make_shared<Protocol::SettingsAnswer const>(json::strToObject(told.data(), told.size()));
    settings_.clear();
    judged_.clear();
    making_.forget();
    letters_.reset();
    inheritedText_ = told;
    inherited_ = parts;
}

SettingsInWork& Desk::settingsOf(std::string const& text) {
    // Those that are written, and those before.
    constexpr std::size_t MOST = 2;
    auto const known =
        std::ranges::find_if(settings_, [&](SettingsInWork const& one) { return one.text().text() == text; });
    if (known != settings_.end())
        settings_.splice(settings_.begin(), settings_, known);
    else
        settings_.emplace_front(text, inherited_);
    if (settings_.size() > MOST)
        settings_.pop_back();
    return settings_.front();
}

Reader::Document& Desk::document(json::Object const& query) {
    return documents_.document(withPages(fileOf(query, folders_.documents)));
}

Answer Desk::evaluate(json::Object const& query) {
    std::optional<BrokenText> const broken = whatIsBroken(query.get("settings").toString());
    if (broken) {
        json::Object answer = linted(broken, nullptr);
        answer.set("document", query.get("document").toString());
        return answerOf(answer);
    }
    // Looking a pattern over costs more than reading a letter by it: that goes with the slower look at the
    // paper.
    json::Object answer{{"broken", json::Value(json_null())}};
    if (query.get("checks").isTrue() || settings(query).isLookedOver())
        answer.set("lint", settings(query).findings());
    answer.set("document", query.get("document").toString());
    try {
        answer.set("version", versionOf(markOf(fileOf(query, folders_.documents))));
        if (isZonesText(fileOf(query, folders_.documents))) {
            addReading(answer, readingOf(query.get("document").toString(), settings(query)), settings(query));
            return answerOf(answer);
        }
        if (!query.get("checks").isTrue()) {
            addEvaluation(answer, document(query), settings(query), nullptr);
            return answerOf(answer);
        }
        MakingReady& making = making_.making(fileOf(query, folders_.documents), settings(query));
        addEvaluation(answer, document(query), settings(query), &making);
    } catch (Base::Error const& failure) {
        answer.set("verdict", "failed");
        answer.set("says", "failed");
        answer.set("error", json::Object{{"code", Base::nameOf(failure.code())},
                                         {"line", Base::validUtf8(failure.what())}});
    }
    return answerOf(answer);
}

Answer Desk::lint(json::Object const& query) {
    std::optional<BrokenText> const broken = whatIsBroken(query.get("settings").toString());
    return answerOf(linted(broken, broken ? nullptr : &settings(query)));
}

Answer Desk::edit(json::Object const& query) {
    SettingsText const before(query.get("settings").toString());
    SettingsText after = before;
    for (json::Value const& change : query.get("changes").toArray())
        after = changed(after, change.toObject());
    return answerOf({{"settings", after.text()}, {"edits", toJson(editsBetween(before, after.text()))}});
}

Answer Desk::picture(json::Object const& query) {
    constexpr long long LEAST = 20;
    constexpr long long MOST = 300;
    Reader::Document& read = document(query);
    int const page = pageOf(query, read);
    long long const dots = query.get("dots").toInt();
    if (dots < LEAST || dots > MOST)
        throw Base::Error(Base::Code::RequestInvalid, "\"dots\" is from 20 to 300 an inch");
    auto const dotsPerInch = static_cast<double>(dots);
    return {200, "image/png",
            query.get("settings").isString() ? printedPage(query, page, dotsPerInch)
                                             : Report::pictureOf(read, page, dotsPerInch)};
}

PrintedLetters const& Desk::printedLetters(json::Object const& query, Along::Checks checks) {
    SettingsInWork& by = settings(query);
    fs::path const file = fileOf(query, folders_.documents);
    FileMark const mark = markOf(file);
    bool const isKnown = letters_ && letters_->settings == by.text().text() && letters_->file == file &&
                         letters_->mark == mark &&
                         (letters_->letters.areChecked || checks == Along::Checks::No);
    if (!isKnown)
        letters_ = {by.text().text(), file, mark, lettersIn(document(query), by, checks)};
    return letters_->letters;
}

std::string Desk::printedPage(json::Object const& query, int page, double dotsPerInch) {
    WantedPicture const wanted{page, sideIn(query.get("side")), dotsPerInch};
    auto const checks = wanted.isCover() ? Along::Checks::Yes : Along::Checks::No;
    PrintedLetters const& letters = printedLetters(query, checks);
    MakingReady& making = making_.making(fileOf(query, folders_.documents), settings(query));
    return printedPicture(document(query), letters, making, wanted);
}

Answer Desk::blocks(json::Object const& query) {
    Reader::Document& read = document(query);
    Reader::Page const& page = read.page(pageOf(query, read));
    Reader::LayoutRules rules;
    if (query.get("settings").isString() && !whatIsBroken(query.get("settings").toString())) {
        auto const [preset, pack] = settings(query).presets().findMatch(read.name());
        rules = Reader::rulesOf(preset);
    }
    Reader::Layout const layout = Reader::layOut(page, rules);
    return answerOf({{"page", page.number},
                     {"width", page.width},
                     {"height", page.height},
                     {"blocks", blocksOf(layout)},
                     {"lines", linesOf(page, layout)}});
}

namespace {

std::optional<FileMark> markIfThere(fs::path const& file) {
    std::error_code ignored;
    return fs::exists(file, ignored) ? std::optional(markOf(file)) : std::nullopt;
}

/// The definitions that the document was read by; none when it got no preset.
Cfg::ExtractZones definitionsFor(DocumentReading const& reading, SettingsInWork& settings) {
    return reading.failed() ? Cfg::ExtractZones()
                            : settings.presets().findMatch(reading.document).first.zones();
}

/// One that cannot be read at all.
DocumentReading unreadable(std::string const& document, Base::Error const& failure) {
    DocumentReading reading;
    reading.document = document;
    reading.error = Base::validUtf8(failure.what());
    reading.code = failure.code();
    return reading;
}

} // namespace

/// As a batch reads it, without looking at paper.
DocumentReading Desk::readingOf(std::string const& name, SettingsInWork& settings) {
    fs::path const file = folders_.documents / name;
    if (isZonesText(file))
        return readZonesFile(file, settings.presets());
    Along along;
    along.limits = Along::Limits::Yes;
    return readDocument(documents_.document(file), settings.presets(), settings.node(), along).reading;
}

DocumentVerdict const& Desk::judge(std::string const& text, std::string const& name) {
    // Those of a few steps back, too.
    constexpr std::size_t MOST = 6;
    auto const known = std::ranges::find(judged_, text, [](auto const& one) { return one.first; });
    if (known != judged_.end())
        judged_.splice(judged_.begin(), judged_, known);
    else
        judged_.emplace_front(text, std::map<std::string, Judged>());
    if (judged_.size() > MOST)
        judged_.pop_back();
    std::map<std::string, Judged>& byName = judged_.front().second;
    fs::path const file = folders_.documents / name;
    fs::path const expectation = expectationBeside(file);
    try {
        FileMark const mark = markOf(file);
        std::optional<FileMark> const expected = markIfThere(expectation);
        auto const found = byName.find(name);
        if (found != byName.end() && found->second.document == mark && found->second.expectation == expected)
            return found->second.verdict;
        SettingsInWork& settings = settingsOf(text);
        DocumentReading reading = readingOf(name, settings);
        Cfg::ExtractZones const definitions = definitionsFor(reading, settings);
        return byName
            .insert_or_assign(name,
                              Judged{mark, expected, verdictOf(std::move(reading), expectation, definitions)})
            .first->second.verdict;
    } catch (Base::Error const& failure) {
        return byName
            .insert_or_assign(name, Judged{{}, {}, verdictOf(unreadable(name, failure), expectation, {})})
            .first->second.verdict;
    }
}

Answer Desk::verdict(json::Object const& query) {
    std::string const name = query.get("document").toString();
    DocumentVerdict const& after = judge(query.get("settings").toString(), name);
    json::Object answer = after.toJson();
    answer.set("document", name);
    json::Value const before = query.get("before");
    answer.set("before", json::Value(json_null()));
    answer.set("change", json::Value(json_null()));
    answer.set("changes", json::Array());
    if (!before.isString())
        return answerOf(answer);
    DocumentVerdict const& old = judge(before.toString(), name);
    Comparison const comparison = compare(old, after);
    json::Array lines;
    for (std::string const& line : comparison.lines)
        lines.append(line);
    answer.set("before", old.toJson());
    answer.set("change", nameOf(comparison.change));
    answer.set("changes", lines);
    return answerOf(answer);
}

Answer Desk::expectation(json::Object const& query) {
    DocumentReading const reading = readingOf(query.get("document").toString(), settings(query));
    if (reading.failed())
        throw Base::Error(reading.code, reading.error);
    return answerOf({{"text", printed(expectationOf(reading))}});
}

Answer Desk::propose(json::Object const& query) const {
    std::vector<Reader::Document> documents;
    for (json::Value const& name : query.get("documents").toArray())
        documents.push_back(Reader::openDocument(withPages(folders_.documents / name.toString())));
    if (documents.empty())
        throw Base::Error(Base::Code::RequestInvalid, "a proposal is made from 1 document or more");
    return answerOf(proposalFrom(documents));
}

Answer Desk::adopt(json::Object const& query) {
    SettingsInWork const& before = settings(query);
    Adopted const after = adopted(before, query.get("proposal").toObject());
    return answerOf({{"settings", after.text.text()},
                     {"edits", toJson(editsBetween(before.text(), after.text.text()))},
                     {"pointer", after.pointer}});
}

} // namespace VlMail::Workbench
