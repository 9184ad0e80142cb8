#pragma once
// What the report shows of a document: out of the letters that were read and how they came about.

#include "programs/reader/letters.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/printed_pages.h"
#include "programs/vlmail/report/report.h"

namespace VlMail::Report {

/// The document without its letters.
Document describe(DocumentReading const& reading);

/// The document with its letters and the pictures of their pages as they are shown. A page that cannot be
/// drawn has the reason instead. Throws Reader::Error when a page cannot be read.
Document describe(DocumentReading const& reading, ShownPages& pages, Reader::Trace const& trace);

} // namespace VlMail::Report
