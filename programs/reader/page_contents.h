#pragma once
// What the contents of a PDF's pages say, and those of forms, patterns and glyphs that are drawn on them.
// Without anything that needs C++20, as qpdf's headers have it.

#include "programs/reader/pdf_page.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <functional>
#include <set>
#include <string>
#include <vector>

namespace Reader {

/// The contents of one PDF, which must live longer. Those that cannot be unpacked whole are written anew in
/// it: what a reader shows of them, and nothing else, is their content from then on.
class PageContents {
public:
    PageContents(QPDF& pdf, EmbeddedFileReader readEmbeddedFile);

    struct Said {
        std::set<std::string> names;
        /// Otherwise there may be more names.
        bool isUnderstood = true;
        bool isWrittenAnew = false;
    };

    /// What a page's own contents say, which may be several streams.
    Said ofPage(QPDFPageObjectHelper page);
    /// `content` is a stream.
    Said of(QPDFObjectHandle content);

private:
    using Parse = std::function<void(QPDFObjectHandle::ParserCallbacks&)>;

    Said said(std::vector<QPDFObjectHandle> const& streams, Parse const& parse);
    bool readNames(Said& said, Parse const& parse);
    bool canBeUnpacked(QPDFObjectHandle stream);
    void writeAnewIfDamaged(QPDFObjectHandle stream);

    QPDF& pdf_;
    EmbeddedFileReader readEmbeddedFile_;
    std::set<QPDFObjGen> writtenAnew_;
};

} // namespace Reader
