// What shows through the window of an envelope.
#include "programs/production/checks.h"
#include "programs/production/words.h"

#include <algorithm>
#include <vector>

namespace Production {
namespace {

/// Print that is smaller by a fifth above an address is the sender's.
constexpr double SENDERS_SIZE = 0.8;
/// How far letters reach beyond the boxes of their words when a page is drawn coarsely, and in another font
/// than the one that was meant.
int rimOf(int size) { return 100 + size / 3; }

Box grown(Box const& box, int by) { return {box.left - by, box.top - by, box.right + by, box.bottom + by}; }

bool isIn(std::vector<Box> const& boxes, Reader::Word const& word) {
    return std::ranges::any_of(boxes, [&](Box const& box) { return box.contains(word.box.centre()); });
}

class Window {
public:
    Window(PageOnPaper const& page, PrintRules const& rules, Findings& findings)
        : page_(page), box_(*rules.production.window), inner_(grown(box_, -rules.production.tolerance)),
          outer_(grown(box_, rules.production.tolerance)), findings_(findings), address_(page.address->box()),
          meant_(page.address->parts) {
        addSendersLine();
        for (Box& box : meant_)
            box = grown(box, rimOf(addressSize()));
    }

    void checkAddress() {
        if (!isInside(address_, outer_))
            findings_.add(Code::AddressOutsideWindow, page_.at(address_),
                          "the address stands at " + placeInWords(address_) + ", the window is " +
                              placeInWords(box_),
                          fixFor(address_, box_));
    }

    /// Text block by block, and what else there is.
    void checkRest() {
        std::optional<Box> const found = ink();
        if (!found)
            return;
        for (TextBlock const& block : blocksIn(wordsIn(*found))) {
            add(block.box, block.text);
            meant_.push_back(grown(block.box, rimOf(block.size)));
        }
        if (std::optional<Box> const rest = ink())
            add(*rest, "something");
    }

private:
    std::optional<Box> ink() const {
        bool const isTiny = inner_.left >= inner_.right || inner_.top >= inner_.bottom;
        return isTiny ? std::nullopt : page_.ink.inside(inner_, meant_);
    }

    void add(Box const& box, std::string const& text) {
        findings_.add(Code::TextInWindow, page_.at(box), text + " shows through the window",
                      "move it " + inWords(wayOutOf(box, box_, page_.sheet())));
    }

    Reader::Page wordsIn(Box const& found) const {
        Reader::Page part = wordsOf(page_.page, found);
        std::erase_if(part.words, [&](Reader::Word const& word) { return isIn(meant_, word); });
        return part;
    }

    /// The nearest line of smaller print above the address, which may have a rule below it.
    void addSendersLine() {
        int const size = addressSize();
        int lowest = outer_.top;
        for (Reader::Word const& word : page_.page.words)
            if (isSenders(word, size))
                lowest = std::max(lowest, word.box.centre().y);
        for (Reader::Word const& word : page_.page.words)
            if (isSenders(word, size) && word.box.top <= lowest && word.box.bottom >= lowest)
                meant_.push_back(
                    {word.box.left, word.box.top, word.box.right, word.box.bottom + word.box.height()});
    }

    int addressSize() const {
        int size = 0;
        for (Reader::Word const& word : page_.page.words)
            if (address_.contains(word.box.centre()))
                size = std::max(size, word.size);
        return size;
    }

    bool isSenders(Reader::Word const& word, int size) const {
        Reader::Point const centre = word.box.centre();
        return word.size <= SENDERS_SIZE * size && centre.y < address_.top && outer_.contains(centre);
    }

    PageOnPaper const& page_;
    Box box_;
    Box inner_;
    Box outer_;
    Findings& findings_;
    Box address_;
    /// To show.
    std::vector<Box> meant_;
};

} // namespace

void checkWindow(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    if (!rules.production.window || !page.address)
        return;
    if (!page.isFirst)
        return findings.add(Code::AddressOutsideWindow, page.at(page.address->box()),
                            "the address does not stand on the letter's first page, which the window shows",
                            "move it to " + placeInWords(*rules.production.window) + " of the first page");
    Window window(page, rules, findings);
    window.checkAddress();
    window.checkRest();
}

} // namespace Production
