#pragma once
// Which annotations of a PDF page a print has: a screen may show others. Without anything that needs C++20:
// clang takes qpdf's headers up to C++17 only.

#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

namespace Reader {

/// What kinds of annotations there are.
struct AnnotationKind {
    char const* subtype;
    /// For people; null where nothing is lost when a print has not got it.
    char const* inWords;
    /// It is more than a picture can show.
    bool isNeverPrinted;
};

/// That of a dictionary with a name for its subtype.
AnnotationKind kindOf(QPDFObjectHandle annotation);

bool isOnScreen(QPDFObjectHandle annotation);
bool isPrinted(QPDFObjectHandle annotation);

/// Whether a print of the page has other annotations than a screen shows.
bool printsOtherAnnotations(QPDFPageObjectHelper page);
/// Leaves the page those annotations that a print has, and has a screen show them.
void keepPrintedAnnotations(QPDFPageObjectHelper page);

} // namespace Reader
