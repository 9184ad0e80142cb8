// What a plan says of a document, and a mailing's metadata of its letters: read, and the same when it is
// written and read again. Of a plan's letters pages are asked for as they stand there. The outline of a
// mailing, which is told from the text, is that of its letters, and so are their digests.
#include "programs/mailing/mailing_outline.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/reading.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return std::move(text).str();
}

template<typename T>
void readTwice(json::Object const& object) {
    try {
        std::string const once = textOf(T::fromJson(object).toJson());
        require(textOf(T::fromJson(json::strToObject(once.data(), once.size())).toJson()) == once);
    } catch (std::runtime_error const&) { // is none
    }
}

long long sheetsOf(Mailing::MailedLetter const& letter, bool duplex) {
    long long sheets = 0;
    for (Mailing::DocumentPages const& document : letter.documents) {
        auto const pages = static_cast<long long>(document.pages.size());
        bool const isOtherSide = document.role == Mailing::DocumentPages::Role::Blank;
        sheets += duplex ? (isOtherSide ? 0 : (pages + 1) / 2) : pages;
    }
    return sheets;
}

void requireDigests(std::vector<Mailing::LetterDigest> const& told,
                    std::vector<Mailing::MailedLetter> const& letters) {
    std::size_t at = 0;
    for (std::size_t letter = 0; letter < letters.size(); ++letter)
        for (std::string const& digest : letters[letter].digests) {
            require(at < told.size() && told[at].digest == digest);
            require(told[at++].number == static_cast<long long>(letter) + 1);
        }
    require(at == told.size());
}

void outlineWhole(json::Object const& object) {
    try {
        auto const metadata = Mailing::Metadata::fromJson(object);
        long long most = 0;
        for (Mailing::MailedLetter const& letter : metadata.letters)
            most = std::max(most, sheetsOf(letter, metadata.packPreset.duplex()));
        Mailing::MailingOutline const outline = Mailing::outlineIn(textOf(metadata.toJson()));
        require(outline.mostSheets == most && outline.again == metadata.again);
        requireDigests(outline.digests, metadata.letters);
    } catch (std::runtime_error const&) { // is none
    }
}

void outline(std::string_view text) {
    try {
        require(Mailing::outlineIn(text).mostSheets >= 0);
    } catch (std::runtime_error const&) { // is none
    }
}

void decide(json::Object const& object) {
    try {
        auto const reading = VlMail::DocumentReading::fromJson(object);
        VlMail::Outcome outcome;
        outcome.count(reading);
        require(!outcome.inWords().empty());
        if (reading.letters)
            for (VlMail::LetterReading const& letter : *reading.letters)
                VlMail::pagesInWords(letter.pages);
    } catch (json::Exc const&) { // is none
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    outline({reinterpret_cast<char const*>(data), size});
    try {
        json::Object const object = json::strToObject(reinterpret_cast<char const*>(data), size);
        readTwice<VlMail::DocumentReading>(object);
        readTwice<Mailing::Metadata>(object);
        outlineWhole(object);
        decide(object);
    } catch (json::Exc const&) { // no JSON object
    }
    return 0;
}
