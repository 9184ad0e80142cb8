#include "programs/production/maker.h"

#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"

#include <algorithm>
#include <utility>

namespace Production {
namespace {

std::string inWords(PageSize page) {
    return Base::inMillimetres(page.width) + " x " + Base::withMillimetres(page.height);
}

PreparedDocument const& unknownDocument() {
    static PreparedDocument const unknown{
        DOCUMENT_UNKNOWN + std::string("a letterhead of the pack preset is not at hand; name its folder")};
    return unknown;
}

PageSize afterTurns(PageSize page, int quarterTurns) { return quarterTurns % 2 == 0 ? page : page.turned(); }

} // namespace

Maker::Maker(Cfg::PackPreset const& preset, PreparedDocuments const& documents)
    : letterheads_(preset.letterheads()), orientation_(preset.orientationForced()),
      mayGroup_(!preset.noGroup()) {
    for (Cfg::LetterheadInf const& letterhead : letterheads_) {
        auto const found = documents.find(letterhead.id);
        documents_.push_back(found == documents.end() ? &unknownDocument() : &found->second);
        pageCounts_.push_back(static_cast<int>(documents_.back()->pages.size()));
    }
}

std::string Maker::whyNot(Part const& part, std::vector<PageSize> const& pages,
                          std::string const& name) const {
    for (std::size_t i = 0; i < letterheads_.size(); ++i)
        if (appliesTo(part, letterheads_[i]) && !documents_[i]->error.empty())
            return documents_[i]->error;
    for (std::size_t i = 0; i < pages.size(); ++i) {
        int const number = static_cast<int>(i) + 1;
        Layers const layers = layersOf(number, part);
        std::string const where = "page " + std::to_string(number) + " of " + name;
        for (auto const* const some : {&layers.under, &layers.over})
            for (Layer const& layer : *some)
                if (std::string why = whyNotOn(pages[i], layer, where); !why.empty())
                    return why;
    }
    return {};
}

/// A letterhead fits the sheet as it is printed, or else the page that is turned along with it.
std::string Maker::whyNotOn(PageSize page, Layer const& layer, std::string const& where) const {
    PageSize const printed = afterTurns(page, quarterTurnsFor(orientation_, page));
    PageSize const letterhead = pageOf(layer).size;
    if (areAlike(letterhead, printed) || areAlike(letterhead, page))
        return {};
    return DOCUMENT_SIZE + std::string("page ") + std::to_string(layer.page) + " of the letterhead " +
           Base::inQuotes(letterheads_[layer.letterhead].id) + " is " + inWords(letterhead) + ", " + where +
           ' ' + inWords(printed) + "; give both the same size, nothing is scaled";
}

PreparedPage Maker::plan(PreparedPage page, Part const& part, int number) const {
    Layers const layers = layersOf(number, part);
    auto const isColoured = [&](Layer const& layer) { return pageOf(layer).isColoured; };
    page.isColoured = page.isColoured || std::any_of(layers.under.begin(), layers.under.end(), isColoured) ||
                      std::any_of(layers.over.begin(), layers.over.end(), isColoured);
    page.size = afterTurns(page.size, quarterTurnsFor(orientation_, page.size));
    return page;
}

PreparedPage Maker::make(PreparedPage page, Part const& part, int number) {
    Layers const layers = layersOf(number, part);
    int const turns = quarterTurnsFor(orientation_, page.size);
    page = plan(std::move(page), part, number);
    PageChange const change{laid(layers.under, page.size), laid(layers.over, page.size), turns};
    if (!change.empty())
        page.pdf = changedPage(page.pdf, change, "page " + std::to_string(number));
    return page;
}

bool Maker::tellsFirstLetters() const {
    return mayGroup_ &&
           std::any_of(letterheads_.begin(), letterheads_.end(), [](Cfg::LetterheadInf const& letterhead) {
               return letterhead.applyFirstGroupedOnly && !letterhead.skipLetters;
           });
}

Layers Maker::layersOf(int number, Part const& part) const {
    return layersOn(number, part, letterheads_, pageCounts_);
}

PreparedPage const& Maker::pageOf(Layer const& layer) const {
    return documents_[layer.letterhead]->pages.at(static_cast<std::size_t>(layer.page - 1));
}

std::vector<PageChange::Laid> Maker::laid(std::vector<Layer> const& layers, PageSize turnedPage) {
    std::vector<PageChange::Laid> pages;
    for (Layer const& layer : layers)
        pages.push_back({&parsed(layer), !areAlike(pageOf(layer).size, turnedPage)});
    return pages;
}

LaidPage const& Maker::parsed(Layer const& layer) {
    std::string const& id = letterheads_[layer.letterhead].id;
    std::pair const key{id, layer.page};
    auto found = parsed_.find(key);
    if (found == parsed_.end())
        found =
            parsed_.emplace(key, LaidPage(pageOf(layer).pdf, "the letterhead " + Base::inQuotes(id))).first;
    return found->second;
}

} // namespace Production
