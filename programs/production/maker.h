#pragma once
// Pages as a pack preset wants them printed: its letterheads on them, and turned.

#include "programs/production/letter_parts.h"
#include "programs/production/page_layers.h"
#include "programs/production/prepared_document.h"

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace Production {

/// Belongs to one thread. Letterheads are parsed when they are first laid on a page.
class Maker {
public:
    /// `documents` outlives the maker; a letterhead that is not among them is unknown.
    Maker(Cfg::PackPreset const& preset, PreparedDocuments const& documents);

    /// Why the pages of a part cannot be made ready: a code and one line; empty when they can. `name` is that
    /// of the part in messages, such as "the letter".
    std::string whyNot(Part const& part, std::vector<PageSize> const& pages, std::string const& name) const;
    /// Page `number`, from 1, of a part for which whyNot() is empty. Throws Error.
    PreparedPage make(PreparedPage page, Part const& part, int number);
    /// The same, but for the PDF.
    PreparedPage plan(PreparedPage page, Part const& part, int number) const;
    /// Whether a letter's pages are others where it is not the first of those that go out as one.
    bool tellsFirstLetters() const;

private:
    Layers layersOf(int number, Part const& part) const;
    PreparedPage const& pageOf(Layer const& layer) const;
    std::string whyNotOn(PageSize page, Layer const& layer, std::string const& where) const;
    std::vector<PageChange::Laid> laid(std::vector<Layer> const& layers, PageSize turnedPage);
    LaidPage const& parsed(Layer const& layer);

    std::vector<Cfg::LetterheadInf> letterheads_;
    PackForcedOrientation orientation_;
    bool mayGroup_;
    /// Of the letterheads, one each.
    std::vector<PreparedDocument const*> documents_;
    std::vector<int> pageCounts_;
    /// By document and page.
    std::map<std::pair<std::string, int>, LaidPage> parsed_;
};

} // namespace Production
