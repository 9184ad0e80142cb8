// A document's bytes, PDF or text: read, searched with the presets that every node has, its first page
// written, held against the document's and read again, and its pictures looked into.
#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/reader/letters.h"
#include "programs/reader/page_pictures.h"

#include "vlservice/platform/log.h"
#include "vlservice/presets/presets.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

constexpr int MAX_PAGES = 4;

void require(bool holds) {
    if (!holds)
        std::abort();
}

void search(Reader::Document& document, Cfg::ExtractPreset const& preset) {
    Reader::Trace trace;
    auto const letters = Reader::readLetters(document, preset, &trace);
    require(letters.size() == 1 && trace.pages.size() == 1);
    require(letters[0].pages.size() == static_cast<std::size_t>(document.pageCount()));
    for (Reader::ZoneTrace const& zone : trace.pages[0].zones)
        for (Reader::FieldTrace const& field : zone.fields)
            require(!field.match || zone.text.find(field.cut) != std::string::npos);
}

void read(std::string bytes) {
    static Cfg::Presets const presets(json::Value(), true, true);
    Reader::Document document = Reader::openDocument(std::move(bytes), "document");
    if (document.pageCount() > MAX_PAGES)
        return;
    search(document, presets.matchExtrPreset("document"));
    document.extrasOf(1);
    document.embeddedFiles();
    document.drawPart(1, {2540, 72, 100, 0, 100, 842});
    std::string const page = document.singlePagePdf(1);
    document.showsTheSame(1, page);
    for (bool const isBare : {false, true})
        for (std::string const& picture : Reader::pictureDigests(page, isBare))
            require(Base::isSha256(picture));
    Reader::Document const single = Reader::openDocument(page, "page");
    require(single.pageCount() == 1);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static bool const isQuiet = [] {
        Log::setSink({});
        return true;
    }();
    static_cast<void>(isQuiet);
    try {
        read(std::string(reinterpret_cast<char const*>(data), size));
    } catch (Base::Error const& error) {
        require(std::string(error.what()).find('\n') == std::string::npos);
    }
    return 0;
}
