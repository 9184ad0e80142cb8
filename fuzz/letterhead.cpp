// A document's bytes as a letterhead: taken apart, laid under and over a page and turned along with it, and a
// page of its own with another letterhead on it. What comes out is one page, and the same a second time.
#include "programs/base/error.h"
#include "programs/production/maker.h"
#include "programs/reader/document.h"

#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using Production::Maker;
using Production::Part;
using Production::PreparedDocument;
using Production::PreparedDocuments;
using Production::PreparedPage;

constexpr std::size_t MAX_PAGES = 3;

void require(bool holds) {
    if (!holds)
        std::abort();
}

Cfg::PackPreset preset(char const* letterheads) {
    std::string const text =
        R"({"name": "P", "orientation": 1, "letterheads": )" + std::string(letterheads) + "}";
    return {json::strToObject(text.data(), text.size()), {}};
}

void makeTwice(Maker& maker, PreparedPage const& page) {
    for (int const number : {1, 2}) {
        try {
            PreparedPage const made = maker.make(page, {Part::Kind::FirstLetter}, number);
            require(Reader::openDocument(made.pdf, "made.pdf").pageCount() == 1);
            require(maker.make(page, {Part::Kind::FirstLetter}, number).pdf == made.pdf);
        } catch (Base::Error const& error) {
            require(std::string(error.what()).find('\n') == std::string::npos);
        }
    }
}

/// A text: its page is as large as most letterheads.
PreparedPage const& plainPage() {
    static PreparedPage const page = Production::prepare("Dear Ada", "letter.txt").pages.at(0);
    return page;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    PreparedDocuments documents;
    documents["plain"] = {{}, {}, {plainPage()}};
    PreparedDocument& given = documents["given"] =
        Production::prepare(std::string(reinterpret_cast<char const*>(data), size), "given");
    require(given.error.empty() == !given.pages.empty());
    require(given.error.find('\n') == std::string::npos);
    given.pages.resize(std::min(given.pages.size(), MAX_PAGES));
    Maker under(preset(R"(["given", {"id": "given", "on_top": true, "repeat_last_page": true}])"), documents);
    makeTwice(under, plainPage());
    Maker around(preset(R"(["plain", {"id": "plain", "on_top": true}])"), documents);
    for (PreparedPage const& page : given.pages)
        makeTwice(around, page);
    return 0;
}
