#include "programs/vlmail/mailings/dispatch.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/vlmail/letters/checking.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/mailings/price.h"
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
    throw Base::Error("there is no pack preset " + Base::inQuotes(name) + "; add it to the settings");
}

long long sumOf(Mailing::Metadata const& mailing, long long Mailing::MailedLetter::*number) {
    return std::accumulate(mailing.letters.begin(), mailing.letters.end(), 0LL,
                           [&](long long sum, auto const& letter) { return sum + letter.*number; });
}

/// A document whose name a container cannot hold would fail all of its mailing in the end.
void requireName(DocumentReading& reading) {
    if (reading.failed() || !reading.letters || Container::mayStandInIndex(reading.document))
        return;
    reading.letters.reset();
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
    outcome_.count(reading);
    if (reading.failed()) {
        fail(reading.document, reading.error);
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

void Dispatch::mailLetters(DocumentReading reading) {
    std::string name;
    for (LetterReading& letter : *reading.letters) {
        std::string const why = letter.whyNot();
        if (!why.empty()) {
            leftOut_.push_back({reading.document, letter.pages, why});
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
        } catch (std::exception const& failure) {
            outcome_.fail();
            fail(packPreset, failure.what());
        }
    }
}

void Dispatch::estimate(Channel::Client& service) {
    for (auto const& [packPreset, mailing] : mailings_)
        prices_[mailing.get()] = estimatePrice(service, pricedLettersOf(mailing->builder().metadata()));
}

void Dispatch::fail(std::string const& name, std::string const& reason) {
    failures_.push_back({name, {}, reason});
    terminal_.complain(reason);
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
    Protocol::Estimate const estimate(found->second);
    return money(estimate.total) + ' ' + estimate.currency;
}

json::Object Dispatch::toJson() const {
    json::Array mailings;
    for (OutgoingMailing* const mailing : arrived_)
        mailings.append(toJson(*mailing));
    json::Array attachments;
    for (std::string const& document : attachments_)
        attachments.append(document);
    json::Object object{{"mailings", mailings},
                        {"left_out", toJson(leftOut_)},
                        {"attachments", attachments},
                        {"failures", toJson(failures_)}};
    if (!notifications_.empty())
        object.set("notifications", toJson(notifications_));
    if (!notes_.empty())
        object.set("notes", json::Form<std::vector<std::string>>::write(notes_));
    return object;
}

json::Array Dispatch::toJson(std::vector<Notification> const& all) {
    json::Array array;
    for (Notification const& each : all)
        array.append(json::Object{{"name", each.name},
                                  {"pages", toJsonArray(each.pages)},
                                  {"field", each.field},
                                  {"address", each.address}});
    return array;
}

json::Array Dispatch::toJson(std::vector<LeftBehind> const& all) {
    json::Array array;
    for (LeftBehind const& left : all) {
        json::Object object{{"name", left.name}};
        if (!left.pages.empty())
            object.set("pages", toJsonArray(left.pages));
        object.set("reason", left.reason);
        array.append(object);
    }
    return array;
}

json::Object Dispatch::toJson(OutgoingMailing& mailing) const {
    Mailing::Metadata const& metadata = mailing.builder().metadata();
    json::Object object{{"pack_preset", metadata.packPreset.name()},
                        {"letters", mailing.builder().letterCount()},
                        {"sent_as", metadata.letters.size()},
                        {"pages", mailing.builder().pageCount()},
                        {"sheets", sumOf(metadata, &Mailing::MailedLetter::sheets)},
                        {"coloured_pages", sumOf(metadata, &Mailing::MailedLetter::colouredPages)}};
    if (std::string const id = mailing.id(); !id.empty()) {
        object.set("id", id);
        object.set("place", mailing.place());
    }
    if (auto const price = prices_.find(&mailing); price != prices_.end())
        object.set("price", price->second);
    return object;
}

} // namespace VlMail
