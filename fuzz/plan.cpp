// What a plan says of a document, and a mailing's metadata of its letters: read, and the same when it is
// written and read again. Of a plan's letters pages are asked for as they stand there.
#include "programs/mailing/metadata.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/reading.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <string>

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
    try {
        json::Object const object = json::strToObject(reinterpret_cast<char const*>(data), size);
        readTwice<VlMail::DocumentReading>(object);
        readTwice<Mailing::Metadata>(object);
        decide(object);
    } catch (json::Exc const&) { // no JSON object
    }
    return 0;
}
