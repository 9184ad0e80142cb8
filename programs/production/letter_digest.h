#pragma once
// By what a letter is known again, whatever file it is in.

#include "programs/base/digest.h"
#include "programs/reader/page.h"
#include "vlservice/extract/extracted_fields.h"

#include <string>
#include <vector>

namespace Production {

/// A SHA-256 over whom a letter goes to and what it shows: the words with their boxes, rounded to 1 mm, and
/// the pictures, page by page. Who made the file, when, and how its parts are named is nowhere in it.
class LetterDigest {
public:
    /// Of a letter that has a primary address.
    explicit LetterDigest(Cfg::ExtractedFields const& fields);

    /// The next page. `pictures` are digests of Reader::pictureDigests().
    void add(Reader::Page const& page, std::vector<std::string> const& pictures);

    /// 64 hexadecimal digits. Nothing is added behind it.
    std::string text() { return digest_.digest(); }

private:
    Base::Sha256 digest_;
};

} // namespace Production
