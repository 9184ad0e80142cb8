#include "programs/reader/page_pictures.h"

#include "programs/base/digest.h"

#include <qpdf/Pipeline.hh>
#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <algorithm>
#include <cstddef>
#include <new>
#include <stdexcept>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;

/// What all pictures of a page may have unpacked.
constexpr std::size_t MAX_BYTES = std::size_t{256} << 20;

class DigestPipe : public Pipeline {
public:
    DigestPipe(Base::Sha256& digest, std::size_t most)
        : Pipeline("digest", nullptr), digest_(digest), left_(most) {}

    // qpdf's signature.
    void write(unsigned char const* data, std::size_t size) override {
        if (size > left_)
            throw std::length_error("a picture is too large");
        left_ -= size;
        digest_.add({reinterpret_cast<char const*>(data), size});
    }
    void finish() override {}
    std::size_t left() const { return left_; }

private:
    Base::Sha256& digest_;
    std::size_t left_;
};

/// Keys that say what the points mean; streams among their values by their contents.
constexpr char const* SAYING[] = {"/Width", "/Height", "/BitsPerComponent", "/Decode", "/ImageMask"};

std::string nameOfSpace(Handle space) {
    if (space.isArray() && space.getArrayNItems() > 0)
        return space.getArrayItem(0).unparse();
    return space.unparse();
}

std::string head(Handle dictionary) {
    std::string text;
    for (char const* const key : SAYING)
        text += dictionary.getKey(key).unparseResolved() + ' ';
    Handle space = dictionary.getKey("/ColorSpace");
    return text + (space.isNull() ? std::string() : nameOfSpace(space)) + '\n';
}

/// The digests of the pictures of one PDF.
class Pictures {
public:
    std::string of(Handle picture, int depth = 0) {
        try {
            return unpacked(picture, depth);
        } catch (std::bad_alloc const&) {
            throw;
        } catch (std::exception const&) {
            return packed(picture);
        }
    }

private:
    std::string unpacked(Handle picture, int depth) {
        Base::Sha256 digest;
        digest.add(head(picture.getDict()));
        DigestPipe pipe(digest, left_);
        if (!picture.pipeStreamData(&pipe, 0, qpdf_dl_all, true, false))
            throw std::runtime_error("it is packed in a way that is not known");
        left_ = pipe.left();
        for (char const* const key : {"/SMask", "/Mask"})
            if (Handle mask = picture.getDict().getKey(key); mask.isStream() && depth == 0)
                digest.add(of(mask, depth + 1));
        return digest.digest();
    }
    static std::string packed(Handle picture) {
        Base::Sha256 digest;
        digest.add(head(picture.getDict()));
        DigestPipe pipe(digest, MAX_BYTES);
        picture.pipeStreamData(&pipe, 0, qpdf_dl_none, true, false);
        return digest.digest();
    }

    std::size_t left_ = MAX_BYTES;
};

std::string drawnOn(QPDFPageObjectHelper page) {
    Base::Sha256 digest;
    DigestPipe pipe(digest, MAX_BYTES);
    page.pipeContents(&pipe);
    return digest.digest();
}

std::vector<std::string> digestsIn(QPDF& pdf, bool isBare) {
    std::vector<QPDFPageObjectHelper> pages = QPDFPageDocumentHelper(pdf).getAllPages();
    if (pages.size() != 1)
        throw std::runtime_error("it has not one page");
    pages.front().externalizeInlineImages(0);
    std::vector<std::string> digests;
    Pictures pictures;
    for (Handle& object : pdf.getAllObjects())
        if (object.isStream() && object.getDict().getKey("/Subtype").isNameAndEquals("/Image"))
            digests.push_back(pictures.of(object));
    if (digests.empty() && isBare)
        digests.push_back(drawnOn(pages.front()));
    std::sort(digests.begin(), digests.end());
    return digests;
}

} // namespace

std::vector<std::string> pictureDigests(std::string_view pdf, bool isBare) {
    try {
        QPDF document;
        document.setSuppressWarnings(true);
        document.processMemoryFile("page", pdf.data(), pdf.size());
        return digestsIn(document, isBare);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        return {Base::sha256(pdf)};
    }
}

} // namespace Reader
