#include "programs/production/joined_pages.h"

#include "programs/base/error.h"
#include "programs/reader/page_parts.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <set>
#include <utility>
#include <vector>

namespace Production {
namespace {

using Handle = QPDFObjectHandle;

void appendAll(Handle from, Handle to) {
    if (from.isArray())
        for (Handle const& item : from.getArrayAsVector())
            to.appendItem(item);
}

/// The layers that a configuration hides, whichever way it says so.
std::vector<Handle> hiddenLayers(Handle layers, Handle configuration) {
    if (!configuration.getKey("/BaseState").isNameAndEquals("/OFF")) {
        Handle off = configuration.getKey("/OFF");
        return off.isArray() ? off.getArrayAsVector() : std::vector<Handle>();
    }
    std::set<QPDFObjGen> shown;
    if (Handle on = configuration.getKey("/ON"); on.isArray())
        for (Handle const& layer : on.getArrayAsVector())
            shown.insert(layer.getObjGen());
    std::vector<Handle> hidden;
    for (Handle const& layer : layers.getArrayAsVector())
        if (shown.count(layer.getObjGen()) == 0)
            hidden.push_back(layer);
    return hidden;
}

/// A dictionary of that name in another, which gets one when it has none.
Handle dictionaryIn(Handle owner, char const* key) {
    if (!owner.getKey(key).isDictionary())
        owner.replaceKey(key, Handle::newDictionary());
    return owner.getKey(key);
}

Handle arrayIn(Handle owner, char const* key) {
    if (!owner.getKey(key).isArray())
        owner.replaceKey(key, Handle::newArray());
    return owner.getKey(key);
}

/// What is said of all pages of a PDF, as a copy that can be carried to another.
Handle saidOfAll(QPDF& pdf, QPDF& target, char const* key) {
    Handle said = pdf.getRoot().getKey(key);
    if (!said.isDictionary())
        return Handle::newNull();
    return target.copyForeignObject(pdf.makeIndirectObject(said.shallowCopy()));
}

void carryLayers(QPDF& pdf, QPDF& target) {
    Handle said = saidOfAll(pdf, target, "/OCProperties");
    if (!said.isDictionary() || !said.getKey("/OCGs").isArray())
        return;
    Handle all = dictionaryIn(target.getRoot(), "/OCProperties");
    Handle configuration = dictionaryIn(all, "/D");
    appendAll(said.getKey("/OCGs"), arrayIn(all, "/OCGs"));
    Handle own = said.getKey("/D");
    if (!own.isDictionary())
        return;
    for (Handle const& layer : hiddenLayers(said.getKey("/OCGs"), own))
        arrayIn(configuration, "/OFF").appendItem(layer);
    appendAll(own.getKey("/AS"), arrayIn(configuration, "/AS"));
}

void carryForm(QPDF& pdf, QPDF& target, std::size_t number) {
    Handle said = saidOfAll(pdf, target, "/AcroForm");
    if (!said.isDictionary() || !said.getKey("/Fields").isArray())
        return;
    Handle form = dictionaryIn(target.getRoot(), "/AcroForm");
    for (Handle field : said.getKey("/Fields").getArrayAsVector()) {
        // Fields of one name would show one value.
        if (field.isDictionary())
            field.replaceKey(
                "/T", Handle::newString("page" + std::to_string(number) + "." +
                                        (field.getKey("/T").isString() ? field.getKey("/T").getStringValue()
                                                                       : std::string("field"))));
        arrayIn(form, "/Fields").appendItem(field);
    }
    for (char const* const key : {"/DR", "/DA", "/NeedAppearances"})
        if (!form.hasKey(key) && said.hasKey(key))
            form.replaceKey(key, said.getKey(key));
}

} // namespace

struct JoinedPages::Parts {
    QPDF pdf;
    std::vector<Handle> pages;

    void append(Handle page) {
        QPDFPageDocumentHelper document(pdf);
        document.addPage(QPDFPageObjectHelper(page), false);
        pages.push_back(document.getAllPages().back().getObjectHandle());
    }
};

JoinedPages::JoinedPages() : parts_(std::make_unique<Parts>()) {
    parts_->pdf.setSuppressWarnings(true);
    parts_->pdf.emptyPDF();
}

JoinedPages::~JoinedPages() = default;

std::size_t JoinedPages::size() const { return parts_->pages.size(); }

void JoinedPages::add(std::string_view pdf) {
    try {
        QPDF single;
        single.setSuppressWarnings(true);
        single.setImmediateCopyFrom(true);
        single.processMemoryFile("page", pdf.data(), pdf.size());
        QPDFPageDocumentHelper document(single);
        document.pushInheritedAttributesToPage();
        QPDFPageObjectHelper const page = document.getAllPages().at(0);
        parts_->append(page.getObjectHandle());
        carryLayers(single, parts_->pdf);
        carryForm(single, parts_->pdf, size());
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        // What is wrong is told without words of the page.
        throw Base::Error(Base::Code::DocumentUnreadable, "is no page of a PDF");
    }
}

void JoinedPages::addAgain(std::size_t at) { parts_->append(parts_->pages.at(at)); }

void JoinedPages::addBlank() {
    QPDFPageObjectHelper front(parts_->pages.back());
    Handle page = Handle::parse("<< /Type /Page /Resources << >> >>");
    page.replaceKey("/MediaBox", front.getAttribute("/MediaBox", true));
    for (char const* const key : {"/CropBox", "/Rotate", "/UserUnit"})
        if (Handle value = front.getAttribute(key, true); !value.isNull())
            page.replaceKey(key, value);
    parts_->append(parts_->pdf.makeIndirectObject(page));
}

void JoinedPages::shrink(std::size_t size) {
    for (; parts_->pages.size() > size; parts_->pages.pop_back())
        QPDFPageDocumentHelper(parts_->pdf).removePage(QPDFPageObjectHelper(parts_->pages.back()));
}

std::string JoinedPages::bytes() { return Reader::bytesOf(parts_->pdf); }

} // namespace Production
