#include "programs/reader/page_contents.h"

#include "programs/reader/page_parts.h"

#include <qpdf/Buffer.hh>
#include <qpdf/Pl_Discard.hh>

#include <algorithm>
#include <new>
#include <utility>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;

class NameCollector : public Handle::ParserCallbacks {
public:
    explicit NameCollector(std::set<std::string>& names) : names_(names) {}

    void handleObject(Handle object) override {
        if (object.isName())
            names_.insert(object.getName());
    }
    void handleEOF() override {}

private:
    std::set<std::string>& names_;
};

/// Of a stream's dictionary, so that it can stand in another PDF.
Handle copied(Handle dictionary, char const* key) {
    Handle copy = dictionary.getKey(key).shallowCopy();
    copy.makeDirect();
    return copy;
}

/// A PDF with the stream as a file inside it, packed as it is.
std::string asEmbeddedFile(Handle stream) {
    QPDF pdf;
    pdf.setSuppressWarnings(true);
    pdf.emptyPDF();
    Handle file = pdf.newStream();
    file.replaceStreamData(stream.getRawStreamData(), copied(stream.getDict(), "/Filter"),
                           copied(stream.getDict(), "/DecodeParms"));
    Handle filespec = pdf.makeIndirectObject(Handle::parse("<< /Type /Filespec /F (content) >>"));
    filespec.replaceKey("/EF", Handle::newDictionary({{"/F", file}}));
    Handle names = Handle::newArray({Handle::newString("content"), filespec});
    pdf.getRoot().replaceKey(
        "/Names", Handle::newDictionary({{"/EmbeddedFiles", Handle::newDictionary({{"/Names", names}})}}));
    return bytesOf(pdf, Packing::AsItIs);
}

} // namespace

PageContents::PageContents(QPDF& pdf, EmbeddedFileReader readEmbeddedFile)
    : pdf_(pdf), readEmbeddedFile_(std::move(readEmbeddedFile)) {}

PageContents::Said PageContents::ofPage(QPDFPageObjectHelper page) {
    return said(page.getPageContents(),
                [&](Handle::ParserCallbacks& callbacks) { page.parseContents(&callbacks); });
}

PageContents::Said PageContents::of(Handle content) {
    return said({content}, [&](Handle::ParserCallbacks& callbacks) { content.parseAsContents(&callbacks); });
}

PageContents::Said PageContents::said(std::vector<Handle> const& streams, Parse const& parse) {
    Said said;
    if (!readNames(said, parse)) {
        for (Handle const& stream : streams)
            writeAnewIfDamaged(stream);
        readNames(said, parse);
    }
    said.isWrittenAnew = std::any_of(streams.begin(), streams.end(), [this](Handle stream) {
        return writtenAnew_.count(stream.getObjGen()) != 0;
    });
    return said;
}

/// Whether nothing was wrong with it.
bool PageContents::readNames(Said& said, Parse const& parse) {
    std::size_t const warnings = pdf_.numWarnings();
    NameCollector collector(said.names);
    try {
        parse(collector);
        said.isUnderstood = true;
        return pdf_.numWarnings() == warnings;
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        said.isUnderstood = false;
        return false;
    }
}

bool PageContents::canBeUnpacked(Handle stream) {
    std::size_t const warnings = pdf_.numWarnings();
    try {
        Pl_Discard nowhere;
        bool isUnpacked = false;
        return stream.pipeStreamData(&nowhere, &isUnpacked, 0, qpdf_dl_specialized) && isUnpacked &&
               pdf_.numWarnings() == warnings;
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        return false;
    }
}

void PageContents::writeAnewIfDamaged(Handle stream) {
    if (!stream.isStream() || canBeUnpacked(stream))
        return;
    std::optional<std::string> const content = readEmbeddedFile_(asEmbeddedFile(stream));
    if (!content)
        return;
    stream.replaceStreamData(*content, Handle::newNull(), Handle::newNull());
    writtenAnew_.insert(stream.getObjGen());
}

} // namespace Reader
