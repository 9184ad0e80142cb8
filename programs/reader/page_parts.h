#pragma once
// What a page of a PDF needs of its document to look the same when it stands alone. Without anything that
// needs C++20, as qpdf's headers have it.

#include "programs/reader/page_contents.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <string>

namespace Reader {

/// Takes fonts and forms out of the page's resources that nothing on the page uses: neither its content nor
/// what is drawn with it, which may use the page's fonts without saying so. Documents often list the fonts
/// and pictures of all pages at each of them. Leaves all as it is when a content cannot be understood. Gives
/// whether one of these contents had to be written anew.
bool dropUnusedResources(QPDFPageObjectHelper page, PageContents& contents);

/// Takes what is no content out of the page's contents, such as objects that an update has freed: some
/// readers show nothing of a page with one.
void dropLostContents(QPDFPageObjectHelper page);

/// Makes each form field on the page one of its own, so that it brings none of the other pages' fields along.
void separateFormFields(QPDFPageObjectHelper page);

/// Carries over which layers are shown, and how the fields of forms look. `page` was added to `single`.
void carryCatalog(QPDF& document, QPDF& single, QPDFPageObjectHelper page);

/// How streams are written.
enum class Packing : bool { Compressed, AsItIs };

/// The PDF as bytes, the same for the same objects.
std::string bytesOf(QPDF& pdf, Packing packing = Packing::Compressed);

} // namespace Reader
