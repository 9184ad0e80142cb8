// What shows through the window of an envelope.
#include "programs/production/checks.h"
#include "programs/production/words.h"

#include <algorithm>
#include <vector>

namespace Production {
namespace {

/// Print that is smaller by a fifth above an address is the sender's.
constexpr double SENDERS_SIZE = 0.8;
/// In font sizes of the address: how far above it the sender's line stands at most.
constexpr int SENDERS_DISTANCE = 3;
/// Around words, in 1/100 mm: their letters' edges when a page is drawn coarsely.
constexpr int RIM = 100;

Box grown(Box const& box, int by) { return {box.left - by, box.top - by, box.right + by, box.bottom + by}; }

bool isInside(Box const& box, Box const& room) {
    return box.left >= room.left && box.top >= room.top && box.right <= room.right &&
           box.bottom <= room.bottom;
}

class Window {
public:
    Window(PageOnPaper const& page, PrintRules const& rules, Findings& findings)
        : page_(page), box_(*rules.production.window), tolerance_(rules.production.tolerance),
          findings_(findings) {}

    void checkAddress() {
        Box const address = page_.address->box();
        if (isInside(address, grown(box_, tolerance_)))
            return;
        findings_.add(Code::AddressOutsideWindow, page_.at(address),
                      "the address stands at " + placeInWords(address) + ", the window is " +
                          placeInWords(box_),
                      fixFor(address, box_));
    }

    void checkRest() {
        Box const inner = grown(box_, -tolerance_);
        if (inner.left >= inner.right || inner.top >= inner.bottom)
            return;
        std::optional<Box> const found = page_.ink.inside(inner, meantToShow());
        if (!found)
            return;
        findings_.add(Code::TextInWindow, page_.at(*found),
                      textInWords(page_.page, *found) + " shows through the window",
                      "move it " + inWords(wayOutOf(*found, box_)));
    }

private:
    /// The address, and the sender's line above it.
    std::vector<Box> meantToShow() const {
        std::vector<Box> boxes;
        if (!page_.address)
            return boxes;
        for (Box const& part : page_.address->parts)
            boxes.push_back(grown(part, RIM));
        addSendersLine(boxes);
        return boxes;
    }

    void addSendersLine(std::vector<Box>& boxes) const {
        Box const address = page_.address->box();
        int const size = addressSize(address);
        int lowest = address.top - SENDERS_DISTANCE * size;
        for (Reader::Word const& word : page_.page.words)
            if (isSenders(word, address, size))
                lowest = std::max(lowest, word.box.centre().y);
        for (Reader::Word const& word : page_.page.words)
            if (isSenders(word, address, size) && word.box.top <= lowest && word.box.bottom >= lowest)
                boxes.push_back(grown(word.box, RIM));
    }

    int addressSize(Box const& address) const {
        int size = 0;
        for (Reader::Word const& word : page_.page.words)
            if (address.contains(word.box.centre()))
                size = std::max(size, word.size);
        return size;
    }

    static bool isSenders(Reader::Word const& word, Box const& address, int size) {
        return word.size <= SENDERS_SIZE * size && word.box.centre().y < address.top &&
               word.box.centre().y > address.top - SENDERS_DISTANCE * size;
    }

    PageOnPaper const& page_;
    Box box_;
    int tolerance_;
    Findings& findings_;
};

} // namespace

void checkWindow(PageOnPaper const& page, PrintRules const& rules, Findings& findings) {
    if (!page.isFirst || !rules.production.window)
        return;
    Window window(page, rules, findings);
    if (page.address)
        window.checkAddress();
    window.checkRest();
}

} // namespace Production
