#include "programs/reader/library_versions.h"

#include "programs/reader/pdf_page.h"

#include <hb.h>
#include <poppler/cpp/poppler-version.h>

namespace Reader {

std::vector<Base::LibraryVersion> libraryVersions() {
    return {
        {"HarfBuzz", hb_version_string()}, {"poppler", poppler::version_string()}, {"qpdf", writerVersion()}};
}

} // namespace Reader
