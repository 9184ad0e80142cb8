#include "programs/vlmail/mailings/dispatch.h"

#include "programs/base/error.h"
#include "programs/base/json_rows.h"
#include "programs/base/quoting.h"
#include "programs/mailing/fallback.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/mailings/careful_upload.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_form.h"
#include "vlservice/pack/container_format.h"

#include <algorithm>
#include <numeric>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

Cfg::PackPreset const& requirePackPreset(std::string const& name, Cfg::Presets const& presets) {
    if (Cfg::PackPreset const* const preset = packPresetNamed(name, presets))
        return *preset;
    throw Base::Error(Base::Code::PresetMissing,
                      "there is no pack preset " + Base::inQuotes(name) + "; add it to the settings");
}

long long sumOf(Mailing::Metadata const& mailing, long long Mailing::MailedLetter::*number) {
    return std::accumulate(mailing.letters.begin(), mailing.letters.end(), 0LL,
                           [&](long long sum, auto const& letter) { return sum + letter.*number; });
}

namespace Schema = Base::Schema;
using Base::Presence;

json::Value unlessEmpty(std::string const& text) { return text.empty() ? json::Value() : json::Value(text); }

json::Value textsOf(std::vector<std::string> const& texts) {
    return json::Form<std::vector<std::string>>::write(texts);
}

std::string moneyOrNothing(std::optional<long long> const& hundredths) {
    return hundredths ? money(*hundredths) : std::string();
}

/// As the mailing names them, without what is added to letters.
std::vector<std::string> documentsOf(Mailing::MailedLetter const& letter) {
    std::vector<std::string> names;
    for (Mailing::DocumentPages const& document : letter.documents)
        if (document.role == Mailing::DocumentPages::Role::Letter &&
            std::ranges::find(names, document.document) == names.end())
            names.push_back(document.document);
    return names;
}

/// The first of them and how many more there are.
std::string listed(std::vector<std::string> const& names) {
    if (names.empty())
        return {};
    return names.size() == 1 ? names.front()
                             : names.front() + " and " + std::to_string(names.size() - 1) + " more";
}

/// The channels that a letter falls back to, in their order.
std::vector<std::string> fallbackOf(Mailing::MailedLetter const& letter, Mailing::Metadata const& mailing) {
    std::vector<std::string> channels;
    for (Mailing::OtherWay const& way : Mailing::otherWaysOf(letter, mailing.packPreset))
        if (way.hasAddress)
            channels.push_back(way.channel);
    return channels;
}

/// A document whose name a container cannot hold would fail all of its mailing in the end.
void requireName(DocumentReading& reading) {
    if (reading.failed() || !reading.letters || Container::mayStandInIndex(reading.document))
        return;
    reading.letters.reset();
    reading.code = Base::Code::NameInvalid;
    reading.error = "cannot mail " + Base::inQuotes(reading.document) +
                    ": its name has a character that a mailing cannot hold; rename the document";
}

} // namespace

Dispatch::Dispatch(Cfg::Presets const& presets, MakingReady const& making, MailingPolicies policies,
                   BeginMailing begin, Terminal const& terminal)
    : presets_(presets), making_(making), policies_(std::move(policies)), begin_(std::move(begin)),
      terminal_(terminal) {}

void Dispatch::take(ReadResult result) {
    DocumentReading& reading = result.reading;
    requireName(reading);
    refuseLetters(reading);
    refuseKnown(reading);
    outcome_.count(reading);
    if (reading.failed()) {
        fail(reading.document, {reading.code, reading.error});
    } else if (reading.isAttachment()) {
        attachments_.push_back(reading.document);
    } else {
        mailLetters(std::move(reading));
    }
}

/// What is out for another reason has enough of one.
void Dispatch::refuseLetters(DocumentReading& reading) {
    Cfg::PackPreset const* const preset = packPresetNamed(reading.packPreset, presets_);
    if (!preset || reading.failed() || reading.isAttachment())
        return;
    for (LetterReading& letter : *reading.letters)
        if (letter.whyNot().empty())
            letter.refusal = policies_.whyNot(
                sheetsOf(letter, *preset) + sheetsOf(making_.attachmentsOf(reading.packPreset), *preset),
                *preset);
}

void Dispatch::refuseKnown(DocumentReading& reading) {
    Cfg::PackPreset const* const preset = packPresetNamed(reading.packPreset, presets_);
    if (!sent_ || !preset || reading.failed() || reading.isAttachment() || !looksForDuplicates(*preset))
        return;
    std::vector<LetterReading*> ready;
    std::vector<std::string> digests;
    for (LetterReading& letter : *reading.letters)
        if (letter.whyNot().empty() && !letter.digest.empty()) {
            ready.push_back(&letter);
            digests.push_back(letter.digest);
        }
    std::map<std::string, std::string> const known = sent_->of(digests);
    for (LetterReading* const letter : ready) {
        if (auto const found = known.find(letter->digest); found != known.end()) {
            letter->refusal = found->second;
            continue;
        }
        auto const [first, isFirst] =
            going_.emplace(letter->digest, reading.document + ", " + pagesInWords(letter->pages));
        if (!isFirst)
            letter->refusal = "sent-before: in this batch, " + first->second;
    }
}

void Dispatch::mailLetters(DocumentReading reading) {
    std::string name;
    for (LetterReading& letter : *reading.letters) {
        std::string const why = letter.whyNot();
        if (!why.empty()) {
            leftOut_.push_back({reading.document, letter.pages, why, letter.codeOfWhyNot()});
            continue;
        }
        MailingBuilder& mailing = mailingFor(reading.packPreset).builder();
        if (name.empty())
            name = mailing.nameFor(reading.document);
        noteNotifications(reading.document, letter);
        noteRedrawnPages(reading.document, letter);
        mailing.add(name, std::move(letter));
    }
}

/// What is said of a letterhead or an attachment holds for the mailing, and is said once.
void Dispatch::noteRedrawnPages(std::string const& name, LetterReading const& letter) {
    for (Production::Finding const& finding : letter.findings) {
        if (finding.code != Production::Code::PageRedrawn)
            continue;
        std::string const said = VlMail::inWords(finding);
        if (!finding.pages.empty())
            notes_.push_back(name + ": " + said);
        else if (std::ranges::find(notes_, said) == notes_.end())
            notes_.push_back(said);
    }
}

void Dispatch::noteNotifications(std::string const& name, LetterReading const& letter) {
    for (auto const& [priority, field] : letter.fields)
        if (priority < 0 && field.rawValue().isString())
            notifications_.push_back({name, letter.pages, field.name(), field.rawValue().toString()});
}

OutgoingMailing& Dispatch::mailingFor(std::string const& packPreset) {
    auto& mailing = mailings_[packPreset];
    if (mailing)
        return *mailing;
    Cfg::PackPreset const& preset = requirePackPreset(packPreset, presets_);
    mailing = begin_(policies_.asAllowed(preset));
    MailingBuilder& builder = mailing->builder();
    builder.useDocuments(making_.attachmentsOf(packPreset), making_.usedDocumentsOf(preset));
    builder.setPurchaseOrder(policies_.purchaseOrder());
    builder.setAgain(again_);
    builder.limitGroups([this](long long sheets) { return policies_.allows(sheets); });
    if (std::string note = policies_.noteOn(preset); !note.empty())
        notes_.push_back(std::move(note));
    return *mailing;
}

void Dispatch::finish() {
    if (std::string note = policies_.noteOnNotifications(); !notifications_.empty() && !note.empty())
        notes_.push_back(std::move(note));
    for (auto const& [packPreset, mailing] : mailings_) {
        try {
            mailing->finish();
            arrived_.push_back(mailing.get());
        } catch (NothingToSend const&) {
            // Which letters stay behind is told of each.
        } catch (std::exception const& failure) {
            outcome_.fail();
            fail(packPreset, {Base::codeOf(failure), failure.what()});
        }
        noteLeftOut(*mailing);
    }
}

/// Another client has sent them while this one was at it.
void Dispatch::noteLeftOut(OutgoingMailing& mailing) {
    for (OutgoingMailing::LeftOut const& left : mailing.leftOut()) {
        Mailing::MailedLetter const& letter = mailing.builder().metadata().letters.at(left.index);
        outcome_.leaveOut(letter.digests.size());
        for (Mailing::DocumentPages const& part : letter.documents)
            if (part.role == Mailing::DocumentPages::Role::Letter)
                leftOut_.push_back({part.document, part.pages, left.why});
    }
}

void Dispatch::estimate(Channel::Client& service) {
    for (auto const& [packPreset, mailing] : mailings_)
        prices_.try_emplace(mailing.get(), service, mailing->builder().metadata());
}

void Dispatch::fail(std::string const& name, Base::Error const& failure) {
    failures_.push_back({name, {}, failure.what(), Base::nameOf(failure.code())});
    terminal_.complain(failure);
}

void Dispatch::print() const {
    auto const number = [](std::size_t n) { return std::to_string(n); };
    constexpr auto RIGHT = TextTable::Align::Right;
    std::vector<TextTable::Column> columns{
        {"pack preset"}, {"letters", RIGHT}, {"sent as", RIGHT}, {"pages", RIGHT}, {"sheets", RIGHT}};
    columns.push_back(prices_.empty() ? TextTable::Column{"mailing"} : TextTable::Column{"price", RIGHT});
    TextTable table(columns);
    for (OutgoingMailing* const mailing : arrived_) {
        MailingBuilder const& builder = mailing->builder();
        table.addRow({builder.metadata().packPreset.name(), number(builder.letterCount()),
                      number(builder.metadata().letters.size()), number(builder.pageCount()),
                      std::to_string(sumOf(builder.metadata(), &Mailing::MailedLetter::sheets)),
                      prices_.empty() ? mailing->place() : priceInWords(mailing)});
    }
    if (!table.empty())
        table.print(terminal_.out);
    if (tellsLetters_)
        printWays();
    for (std::string const& document : attachments_)
        terminal_.out << "not a letter: " << document << ", an attachment\n";
    for (Notification const& each : notifications_)
        terminal_.out << "to be notified: " << Base::inQuotes(each.address) << " of " << each.name << ", "
                      << pagesInWords(each.pages) << ", by its field " << Base::inQuotes(each.field) << '\n';
    for (LeftBehind const& letter : leftOut_)
        terminal_.out << "left out: " << letter.name << ", " << pagesInWords(letter.pages) << ": "
                      << letter.reason << '\n';
    for (std::string const& note : notes_)
        terminal_.out << "note: " << note << '\n';
    terminal_.out << outcome_.inWords() << '\n';
}

std::string Dispatch::priceInWords(OutgoingMailing const* mailing) const {
    auto const found = prices_.find(mailing);
    if (found == prices_.end())
        return {};
    Protocol::Estimate const estimate(found->second.answer());
    return money(estimate.total) + ' ' + estimate.currency;
}

struct Dispatch::Rows {
    struct OfMailing {
        Dispatch const& dispatch;
        OutgoingMailing& mailing;

        Mailing::Metadata const& metadata() const { return mailing.builder().metadata(); }
    };

    struct OfLetter {
        OfMailing const& of;
        Mailing::MailedLetter const& letter;
    };
    static json::Value waysOf(OfMailing const& of);

    static json::Object pages() { return Schema::listOf(Schema::integer(1)); }
    static json::Object count() { return Schema::integer(0); }
    static json::Object price() { return Schema::mapOf(Schema::anything()); }
    template<typename Element>
    static json::Array listOf(std::vector<Element> const& all, std::span<Base::JsonRow<Element> const> rows);

    static json::Value priceBy(OfLetter const& of, std::string const& channel) {
        auto const price = of.of.dispatch.priceOf(of.of.mailing, of.letter, channel);
        return price ? json::Value(*price) : json::Value();
    }
    struct OfFallback {
        OfLetter const& of;
        std::string const& channel;
    };
    static json::Value fallbackOf(OfLetter const& of);

    static constexpr Base::JsonRow<OfFallback> FALLBACK[] = {
        {"channel", Presence::Always, &Schema::text,
         [](OfFallback const& each) -> json::Value { return each.channel; }},
        {"price", Presence::WhenThere, &count,
         [](OfFallback const& each) { return priceBy(each.of, each.channel); }},
    };
    static constexpr Base::JsonRow<OfLetter> WAY[] = {
        {"documents", Presence::Always, [] { return Schema::listOf(Schema::text()); },
         [](OfLetter const& of) { return textsOf(documentsOf(of.letter)); }},
        {"pages", Presence::Always, &count,
         [](OfLetter const& of) -> json::Value { return printedPages(of.letter); }},
        {"sheets", Presence::Always, &count,
         [](OfLetter const& of) -> json::Value { return of.letter.sheets; }},
        {"channel", Presence::Always, &Schema::text,
         [](OfLetter const& of) -> json::Value { return Mailing::channelOf(of.letter); }},
        {"price", Presence::WhenThere, &count,
         [](OfLetter const& of) { return priceBy(of, Mailing::channelOf(of.letter)); }},
        {"fallback", Presence::WhenThere, [] { return Schema::listOf(Base::schemaOf<OfFallback>(FALLBACK)); },
         &fallbackOf},
    };
    static constexpr Base::JsonRow<OfMailing> MAILING[] = {
        {"pack_preset", Presence::Always, &Schema::text,
         [](OfMailing const& of) -> json::Value { return of.metadata().packPreset.name(); }},
        {"letters", Presence::Always, &count,
         [](OfMailing const& of) -> json::Value { return of.mailing.builder().letterCount(); }},
        {"sent_as", Presence::Always, &count,
         [](OfMailing const& of) -> json::Value { return of.metadata().letters.size(); }},
        {"pages", Presence::Always, &count,
         [](OfMailing const& of) -> json::Value { return of.mailing.builder().pageCount(); }},
        {"sheets", Presence::Always, &count,
         [](OfMailing const& of) -> json::Value {
             return sumOf(of.metadata(), &Mailing::MailedLetter::sheets);
         }},
        {"coloured_pages", Presence::Always, &count,
         [](OfMailing const& of) -> json::Value {
             return sumOf(of.metadata(), &Mailing::MailedLetter::colouredPages);
         }},
        {"id", Presence::WhenThere, &Schema::text,
         [](OfMailing const& of) { return unlessEmpty(of.mailing.id()); }},
        {"place", Presence::WhenThere, &Schema::text,
         [](OfMailing const& of) {
             return of.mailing.id().empty() ? json::Value() : json::Value(of.mailing.place());
         }},
        {"price", Presence::WhenThere, &price,
         [](OfMailing const& of) {
             auto const found = of.dispatch.prices_.find(&of.mailing);
             return found == of.dispatch.prices_.end() ? json::Value() : json::Value(found->second.answer());
         }},
        {"ways", Presence::WhenThere, [] { return Schema::listOf(Base::schemaOf<OfLetter>(WAY)); },
         [](OfMailing const& of) { return of.dispatch.tellsLetters_ ? waysOf(of) : json::Value(); }},
    };
    static constexpr Base::JsonRow<LeftBehind> LEFT_BEHIND[] = {
        {"name", Presence::Always, &Schema::text,
         [](LeftBehind const& left) -> json::Value { return left.name; }},
        {"pages", Presence::WhenThere, &pages,
         [](LeftBehind const& left) { return left.pages.empty() ? json::Value() : toJsonArray(left.pages); }},
        {"reason", Presence::Always, &Schema::text,
         [](LeftBehind const& left) -> json::Value { return left.reason; }},
        {"code", Presence::WhenThere, &Schema::text,
         [](LeftBehind const& left) { return unlessEmpty(left.code); }},
    };
    static constexpr Base::JsonRow<Notification> NOTIFICATION[] = {
        {"name", Presence::Always, &Schema::text,
         [](Notification const& each) -> json::Value { return each.name; }},
        {"pages", Presence::Always, &pages,
         [](Notification const& each) -> json::Value { return toJsonArray(each.pages); }},
        {"field", Presence::Always, &Schema::text,
         [](Notification const& each) -> json::Value { return each.field; }},
        {"address", Presence::Always, &Schema::text,
         [](Notification const& each) -> json::Value { return each.address; }},
    };
    static constexpr Base::JsonRow<Dispatch> OUTCOME[] = {
        {"mailings", Presence::Always, [] { return Schema::listOf(Base::schemaOf<OfMailing>(MAILING)); },
         [](Dispatch const& all) -> json::Value { return all.mailingsToJson(); }},
        {"left_out", Presence::Always, [] { return Schema::listOf(Base::schemaOf<LeftBehind>(LEFT_BEHIND)); },
         [](Dispatch const& all) -> json::Value { return listOf<LeftBehind>(all.leftOut_, LEFT_BEHIND); }},
        {"attachments", Presence::Always, [] { return Schema::listOf(Schema::text()); },
         [](Dispatch const& all) { return textsOf(all.attachments_); }},
        {"failures", Presence::Always, [] { return Schema::listOf(Base::schemaOf<LeftBehind>(LEFT_BEHIND)); },
         [](Dispatch const& all) -> json::Value { return listOf<LeftBehind>(all.failures_, LEFT_BEHIND); }},
        {"notifications", Presence::WhenThere,
         [] { return Schema::listOf(Base::schemaOf<Notification>(NOTIFICATION)); },
         [](Dispatch const& all) {
             return all.notifications_.empty() ? json::Value()
                                               : listOf<Notification>(all.notifications_, NOTIFICATION);
         }},
        {"notes", Presence::WhenThere, [] { return Schema::listOf(Schema::text()); },
         [](Dispatch const& all) { return all.notes_.empty() ? json::Value() : textsOf(all.notes_); }},
    };
};

template<typename Element>
json::Array Dispatch::Rows::listOf(std::vector<Element> const& all,
                                   std::span<Base::JsonRow<Element> const> rows) {
    json::Array array;
    for (Element const& each : all) {
        json::Object object;
        Base::writeRows(rows, each, object);
        array.append(object);
    }
    return array;
}

json::Value Dispatch::Rows::fallbackOf(OfLetter const& of) {
    json::Array ways;
    for (std::string const& channel : VlMail::fallbackOf(of.letter, of.of.metadata())) {
        json::Object way;
        Base::writeRows<OfFallback>(FALLBACK, {of, channel}, way);
        ways.append(way);
    }
    return ways.empty() ? json::Value() : json::Value(ways);
}

json::Value Dispatch::Rows::waysOf(OfMailing const& of) {
    json::Array ways;
    for (Mailing::MailedLetter const& letter : of.metadata().letters) {
        json::Object way;
        Base::writeRows<OfLetter>(WAY, {of, letter}, way);
        ways.append(way);
    }
    return ways;
}

json::Array Dispatch::mailingsToJson() const {
    json::Array array;
    for (OutgoingMailing* const mailing : arrived_) {
        json::Object object;
        Base::writeRows<Rows::OfMailing>(Rows::MAILING, {*this, *mailing}, object);
        array.append(object);
    }
    return array;
}

json::Object Dispatch::toJson() const {
    json::Object object;
    Base::writeRows<Dispatch>(Rows::OUTCOME, *this, object);
    return object;
}

json::Object Dispatch::schema() { return Base::schemaOf<Dispatch>(Rows::OUTCOME); }

std::optional<long long> Dispatch::priceOf(OutgoingMailing const& mailing,
                                           Mailing::MailedLetter const& letter,
                                           std::string const& channel) const {
    auto const price = prices_.find(&mailing);
    return price == prices_.end() ? std::nullopt : price->second.of(letter, channel);
}

std::vector<std::string> Dispatch::wayInWords(OutgoingMailing& mailing,
                                              Mailing::MailedLetter const& letter) const {
    std::string channels = Mailing::channelOf(letter);
    std::string prices = moneyOrNothing(priceOf(mailing, letter, channels));
    for (std::string const& channel : fallbackOf(letter, mailing.builder().metadata())) {
        channels += ", else " + channel;
        prices += ", else " + moneyOrNothing(priceOf(mailing, letter, channel));
    }
    std::vector<std::string> row{listed(documentsOf(letter)), channels, std::to_string(printedPages(letter)),
                                 std::to_string(letter.sheets)};
    if (!prices_.empty())
        row.push_back(prices);
    return row;
}

void Dispatch::printWays() const {
    constexpr auto RIGHT = TextTable::Align::Right;
    std::vector<TextTable::Column> columns{{"letter"}, {"channel"}, {"pages", RIGHT}, {"sheets", RIGHT}};
    if (!prices_.empty())
        columns.push_back({"price", RIGHT});
    TextTable table(columns);
    for (OutgoingMailing* const mailing : arrived_)
        for (Mailing::MailedLetter const& letter : mailing->builder().metadata().letters)
            table.addRow(wayInWords(*mailing, letter));
    if (table.empty())
        return;
    terminal_.out << '\n';
    table.print(terminal_.out);
    terminal_.out << '\n';
}

} // namespace VlMail
