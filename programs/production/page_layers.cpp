#include "programs/production/page_layers.h"

#include "programs/base/error.h"
#include "programs/production/shown_layers.h"
#include "programs/reader/page_parts.h"
#include "programs/reader/printed_annotations.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFMatrix.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace Production {
namespace {

using Handle = QPDFObjectHandle;

/// In the units of a page, as its content counts them.
struct Box {
    double left;
    double bottom;
    double right;
    double top;

    double width() const { return right - left; }
    double height() const { return top - bottom; }
    Handle inPdf() const { return Handle::newArray(Handle::Rectangle(left, bottom, right, top)); }
};

/// US letter, which readers take for a page that does not tell its size.
constexpr Box UNKNOWN{0, 0, 612, 792};

Box boxIn(Handle box, Box const& otherwise) {
    if (!box.isRectangle())
        return otherwise;
    Handle::Rectangle const edges = box.getArrayAsRectangle();
    return edges.llx < edges.urx && edges.lly < edges.ury ? Box{edges.llx, edges.lly, edges.urx, edges.ury}
                                                          : otherwise;
}

Box mediaBox(QPDFPageObjectHelper page) { return boxIn(page.getAttribute("/MediaBox", false), UNKNOWN); }

/// What readers show of a page.
Box shownBox(QPDFPageObjectHelper page) {
    Box const media = mediaBox(page);
    Box const crop = boxIn(page.getAttribute("/CropBox", false), media);
    Box const both{std::max(media.left, crop.left), std::max(media.bottom, crop.bottom),
                   std::min(media.right, crop.right), std::min(media.top, crop.top)};
    return both.width() > 0 && both.height() > 0 ? both : media;
}

/// In quarters, clockwise; a page that says anything else is not turned.
int quarterTurnsOf(QPDFPageObjectHelper page) {
    Handle turn = page.getAttribute("/Rotate", false);
    long long const degrees = turn.isInteger() ? turn.getIntValue() % 360 : 0;
    return degrees % 90 == 0 ? static_cast<int>((degrees + 360) / 90 % 4) : 0;
}

/// A page as it is shown. Its /UserUnit is left aside, as readers do who tell how large pages are.
struct Shown {
    Box box;
    int quarterTurns;

    explicit Shown(QPDFPageObjectHelper page) : box(shownBox(page)), quarterTurns(quarterTurnsOf(page)) {}

    double height() const { return quarterTurns % 2 == 0 ? box.height() : box.width(); }

    /// From places in the content to points from the lower left corner of what is shown.
    QPDFMatrix matrix() const {
        switch (quarterTurns) {
        case 1:
            return {0, -1, 1, 0, -box.bottom, box.right};
        case 2:
            return {-1, 0, 0, -1, box.right, box.top};
        case 3:
            return {0, 1, -1, 0, box.top, -box.left};
        default:
            return {1, 0, 0, 1, -box.left, -box.bottom};
        }
    }
};

/// Of a turn and a move.
QPDFMatrix inverse(QPDFMatrix const& m) {
    QPDFMatrix const turned(m.a, m.c, m.b, m.d, 0, 0);
    double x = 0;
    double y = 0;
    turned.transform(m.e, m.f, x, y);
    return {turned.a, turned.b, turned.c, turned.d, -x, -y};
}

/// From places in the content of a page to those in the content of another on which it lies.
QPDFMatrix placement(Shown const& laid, Shown const& on) {
    QPDFMatrix matrix = inverse(on.matrix());
    matrix.translate(0, on.height() - laid.height());
    matrix.concat(laid.matrix());
    return matrix;
}

/// What the page shows, annotations too, becomes a form that shows it where it stands. Only what tells how
/// its bytes are packed is kept of the content's dictionary: the rest means nothing there and a lot in a
/// form.
Handle formOf(QPDF& pdf, QPDFPageObjectHelper page, Box const& visible) {
    page.coalesceContentStreams();
    Handle content = page.getObjectHandle().getKey("/Contents");
    Handle form = content.isStream() ? content : pdf.newStream("");
    Handle keys = Handle::newDictionary();
    for (char const* const key : {"/Length", "/Filter", "/DecodeParms"})
        if (form.getDict().hasKey(key))
            keys.replaceKey(key, form.getDict().getKey(key));
    keys.replaceKey("/Type", Handle::newName("/XObject"));
    keys.replaceKey("/Subtype", Handle::newName("/Form"));
    keys.replaceKey("/BBox", visible.inPdf());
    Handle resources = page.getAttribute("/Resources", false);
    keys.replaceKey("/Resources", resources.isDictionary() ? resources : Handle::newDictionary());
    form.replaceDict(keys);
    return form;
}

bool hasAnnotations(QPDFPageObjectHelper page) {
    Handle annotations = page.getObjectHandle().getKey("/Annots");
    return annotations.isArray() && annotations.getArrayNItems() > 0;
}

/// Otherwise they would lie above all that is laid on the page. What no print has stays out.
void drawAnnotations(QPDF& pdf, QPDFPageObjectHelper page) {
    if (!hasAnnotations(page))
        return;
    Reader::keepPrintedAnnotations(page);
    QPDFPageDocumentHelper(pdf).flattenAnnotations();
}

QPDFPageObjectHelper onlyPage(QPDF& pdf) {
    auto const pages = QPDFPageDocumentHelper(pdf).getAllPages();
    if (pages.size() != 1)
        throw std::runtime_error("It is not one page.");
    return pages.front();
}

void parse(QPDF& pdf, std::string const& bytes, std::string const& where) {
    pdf.setSuppressWarnings(true);
    pdf.processMemoryFile(where.c_str(), bytes.data(), bytes.size());
}

[[noreturn]] void failToLay(std::string const& where) {
    throw Base::Error(Base::Code::DocumentUnreadable,
                      where + ": cannot be made ready, it is damaged; print it to a new PDF");
}

} // namespace

struct LaidPage::Parsed {
    Parsed(std::string bytes, std::string const& where) : pdf(std::move(bytes)) {
        parse(source, pdf, where);
        QPDFPageObjectHelper page = onlyPage(source);
        drawAnnotations(source, page);
        shown = std::make_unique<Shown>(page);
        form = formOf(source, page, shown->box);
        // Its colours mix among themselves, as they do on a page that stands alone.
        if (Handle group = page.getObjectHandle().getKey("/Group"); group.isDictionary())
            form.getDict().replaceKey("/Group", group);
    }

    /// `source` reads from it.
    std::string const pdf;
    QPDF source;
    std::unique_ptr<Shown> shown;
    Handle form;
};

LaidPage::LaidPage(std::string pdf, std::string const& where) {
    try {
        parsed_ = std::make_unique<Parsed>(std::move(pdf), where);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        failToLay(where);
    }
}

LaidPage::~LaidPage() = default;
LaidPage::LaidPage(LaidPage&&) noexcept = default;
LaidPage& LaidPage::operator=(LaidPage&&) noexcept = default;

namespace {

/// Builds the content of a page out of forms.
class Pile {
public:
    Pile(QPDF& pdf, QPDFPageObjectHelper page, int quarterTurns)
        : pdf_(pdf), page_(page), before_(page), after_(page) {
        after_.quarterTurns = (before_.quarterTurns + quarterTurns) % 4;
        Handle own = page.getAttribute("/Resources", false);
        // Annotations may take what they need from the page without saying so.
        resources_ = hasAnnotations(page) && own.isDictionary() ? own.shallowCopy() : Handle::newDictionary();
        Handle forms = resources_.getKey("/XObject");
        forms_ = forms.isDictionary() ? forms.shallowCopy() : Handle::newDictionary();
    }

    void add(PageChange::Laid const& laid) {
        LaidPage::Parsed& page = laid.page->parsed();
        showLayersOf(page.source, pdf_);
        draw(pdf_.copyForeignObject(page.form),
             placement(*page.shown, laid.isTurnedAlong ? before_ : after_).unparse() + " cm ");
    }

    void addContent() { draw(formOf(pdf_, page_, mediaBox(page_)), ""); }

    void finish() {
        resources_.replaceKey("/XObject", forms_);
        Handle page = page_.getObjectHandle();
        page.replaceKey("/Resources", resources_);
        page.replaceKey("/Contents", pdf_.newStream(content_));
    }

private:
    void draw(Handle form, std::string const& where) {
        std::string name;
        do
            name = "/Part" + std::to_string(++count_);
        while (forms_.hasKey(name));
        forms_.replaceKey(name, form);
        content_ += "q " + where + name + " Do Q\n";
    }

    QPDF& pdf_;
    QPDFPageObjectHelper page_;
    Shown before_;
    Shown after_;
    Handle resources_;
    Handle forms_;
    std::string content_;
    int count_ = 0;
};

void lay(QPDF& pdf, QPDFPageObjectHelper page, PageChange const& change) {
    if (!change.over.empty())
        drawAnnotations(pdf, page);
    Pile pile(pdf, page, change.quarterTurns);
    for (PageChange::Laid const& laid : change.under)
        pile.add(laid);
    pile.addContent();
    for (PageChange::Laid const& laid : change.over)
        pile.add(laid);
    pile.finish();
}

} // namespace

std::string changedPage(std::string const& pdf, PageChange const& change, std::string const& where) {
    try {
        QPDF changed;
        parse(changed, pdf, where);
        QPDFPageObjectHelper page = onlyPage(changed);
        if (!change.under.empty() || !change.over.empty())
            lay(changed, page, change);
        int const turns = (quarterTurnsOf(page) + change.quarterTurns) % 4;
        if (change.quarterTurns != 0)
            page.getObjectHandle().replaceKey("/Rotate", Handle::newInteger(90LL * turns));
        return Reader::bytesOf(changed);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        failToLay(where);
    }
}

} // namespace Production
