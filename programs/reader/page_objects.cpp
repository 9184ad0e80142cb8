#include "programs/reader/page_objects.h"

#include <qpdf/Buffer.hh>
#include <qpdf/Pipeline.hh>
#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <algorithm>
#include <map>
#include <set>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;
using Keys = std::set<std::string>;

/// Pages of more parts are not looked into.
constexpr std::size_t MAX_PARTS = 200'000;
/// Of streams that are compared unpacked, or searched for names, in all.
constexpr std::size_t MAX_UNPACKED = 64 << 20;

// What a person sees depends on none of these.
Keys const OF_PACKING{"/Length", "/Filter", "/DecodeParms"};
Keys const OF_INTERACTION{"/A",      "/AA",    "/Dest",         "/IRT", "/NM", "/P",
                          "/Parent", "/Popup", "/StructParent", "/T",   "/TM", "/TU"};
/// A field may have them from the ones above it.
Keys const OF_FIELDS{"/DA", "/DV", "/FT", "/Ff", "/MaxLen", "/Opt", "/Q", "/V"};
Keys const OF_FORM{"/Fields", "/XFA", "/CO", "/SigFlags"};
/// Streams behind them hold no operators.
Keys const OF_FONT_FILES{"/FontFile", "/FontFile2", "/FontFile3", "/ToUnicode", "/CIDToGIDMap"};

Keys keysOf(Handle dictionary, std::initializer_list<Keys const*> without) {
    Keys keys = dictionary.getKeys();
    for (Keys const* const left : without)
        for (std::string const& key : *left)
            keys.erase(key);
    return keys;
}

bool isDelimiter(char c) {
    return std::string_view("()<>[]{}/%").find(c) != std::string_view::npos || (c >= 0 && c <= ' ');
}

/// Whether operators may use the name; what is said with escapes may be any name.
bool mayName(std::string const& content, std::string const& name) {
    for (std::size_t at = content.find('/'); at != std::string::npos; at = content.find('/', at + 1)) {
        std::size_t const end = static_cast<std::size_t>(
            std::find_if(content.begin() + static_cast<std::ptrdiff_t>(at) + 1, content.end(), isDelimiter) -
            content.begin());
        std::string_view const said = std::string_view(content).substr(at, end - at);
        if (said == name || said.find('#') != std::string_view::npos)
            return true;
    }
    return false;
}

/// Keeps up to a number of bytes.
class Kept : public Pipeline {
public:
    explicit Kept(std::size_t& left) : Pipeline("kept", nullptr), left_(left) {}

    void write(unsigned char const* data, std::size_t size) override {
        if (size > left_)
            throw std::length_error("too much to compare");
        left_ -= size;
        bytes.append(reinterpret_cast<char const*>(data), size);
    }
    void finish() override {}

    std::string bytes;

private:
    std::size_t& left_;
};

/// Two parts of pages, which are the same when all that they reach is the same, object by object.
class Comparison {
public:
    bool areSame(QPDFPageObjectHelper page, QPDFPageObjectHelper other) {
        return haveSameBoxes(page, other) && haveSameResources(page, other) &&
               haveSameAnnotations(page, other) &&
               push(page.getObjectHandle().getKey("/Contents"),
                    other.getObjectHandle().getKey("/Contents")) &&
               push(page.getObjectHandle().getKey("/Group"), other.getObjectHandle().getKey("/Group")) &&
               finish();
    }

    /// Of the documents: what says which layers are shown and how fields look.
    bool haveSameCatalogs(Handle root, Handle other) {
        return push(root.getKey("/OCProperties"), other.getKey("/OCProperties")) &&
               (!hasFields_ || haveSameForms(root.getKey("/AcroForm"), other.getKey("/AcroForm"))) &&
               finish();
    }

    /// Whether no content names what only the document's page has.
    bool needsNoMore() {
        return dropped_.empty() ||
               std::none_of(contents_.begin(), contents_.end(), [this](auto const& content) {
                   std::string const operators = unpacked(content.second);
                   return std::any_of(dropped_.begin(), dropped_.end(),
                                      [&](std::string const& name) { return mayName(operators, name); });
               });
    }

private:
    using Pair = std::pair<Handle, Handle>;

    bool haveSameBoxes(QPDFPageObjectHelper page, QPDFPageObjectHelper other) {
        for (char const* const key : {"/MediaBox", "/CropBox", "/Rotate"})
            if (!push(page.getAttribute(key, false), other.getAttribute(key, false)))
                return false;
        return push(page.getObjectHandle().getKey("/UserUnit"), other.getObjectHandle().getKey("/UserUnit"));
    }

    bool haveSameResources(QPDFPageObjectHelper page, QPDFPageObjectHelper other) {
        Handle resources = page.getAttribute("/Resources", false);
        Handle others = other.getAttribute("/Resources", false);
        if (!resources.isDictionary() || !others.isDictionary())
            return push(resources, others);
        Keys const ofKinds{"/Font", "/XObject"};
        return pushAll(resources, others, {&ofKinds}) && haveUsed(resources, others, "/Font") &&
               haveUsed(resources, others, "/XObject");
    }

    /// The other one may have fewer.
    bool haveUsed(Handle resources, Handle others, char const* kind) {
        Handle all = resources.getKey(kind);
        Handle kept = others.getKey(kind);
        if (!all.isDictionary() || !kept.isDictionary())
            return push(all, kept);
        Keys dropped = keysOf(all, {});
        for (std::string const& name : keysOf(kept, {}))
            if (dropped.erase(name) == 0 || !push(all.getKey(name), kept.getKey(name), name))
                return false;
        dropped_.insert(dropped.begin(), dropped.end());
        return true;
    }

    bool haveSameAnnotations(QPDFPageObjectHelper page, QPDFPageObjectHelper other) {
        Handle annotations = page.getObjectHandle().getKey("/Annots");
        Handle others = other.getObjectHandle().getKey("/Annots");
        if (!annotations.isArray() || !others.isArray())
            return push(annotations, others);
        if (annotations.getArrayNItems() != others.getArrayNItems())
            return false;
        for (int i = 0; i < annotations.getArrayNItems(); ++i)
            if (!isSameAnnotation(annotations.getArrayItem(i), others.getArrayItem(i)))
                return false;
        return true;
    }

    bool isSameAnnotation(Handle annotation, Handle other) {
        if (!annotation.isDictionary() || !other.isDictionary())
            return push(annotation, other);
        if (!arePartners(annotation, other) || !pushAll(annotation, other, {&OF_INTERACTION, &OF_FIELDS}))
            return false;
        return !annotation.getKey("/Subtype").isNameAndEquals("/Widget") || isSameField(annotation, other);
    }

    /// Those without an appearance of their own are left to who draws them.
    bool isSameField(Handle field, Handle other) {
        hasFields_ = true;
        return field.getKey("/AP").isDictionary() &&
               std::all_of(OF_FIELDS.begin(), OF_FIELDS.end(), [&](std::string const& key) {
                   return push(ofField(field, key), ofField(other, key));
               });
    }

    static Handle ofField(Handle field, std::string const& key) {
        std::set<QPDFObjGen> seen;
        while (field.isDictionary() && !field.hasKey(key) && seen.insert(field.getObjGen()).second)
            field = field.getKey("/Parent");
        return field.isDictionary() ? field.getKey(key) : Handle::newNull();
    }

    bool haveSameForms(Handle form, Handle other) {
        if (!form.isDictionary() || !other.isDictionary())
            return push(form, other);
        Handle draws = form.getKey("/NeedAppearances");
        return !(draws.isBool() && draws.getBoolValue()) && pushAll(form, other, {&OF_FORM});
    }

    bool finish() {
        while (!waiting_.empty()) {
            auto const [one, other] = std::move(waiting_.back());
            waiting_.pop_back();
            if (!isSame(one, other))
                return false;
        }
        return true;
    }

    bool isSame(Handle one, Handle other) {
        if (one.getTypeCode() != other.getTypeCode())
            return false;
        if (one.isStream())
            return isSameStream(one, other);
        if (one.isDictionary())
            return pushAll(one, other, {});
        if (!one.isArray())
            return one.unparseResolved() == other.unparseResolved();
        std::vector<Handle> const items = one.getArrayAsVector();
        std::vector<Handle> const others = other.getArrayAsVector();
        return std::equal(items.begin(), items.end(), others.begin(), others.end(),
                          [this](Handle const& item, Handle const& its) { return push(item, its); });
    }

    bool isSameStream(Handle one, Handle other) {
        if (!pushAll(one.getDict(), other.getDict(), {&OF_PACKING}))
            return false;
        if (isPackedAlike(one.getDict(), other.getDict())) {
            // What they refer to may still differ.
            for (char const* const key : {"/Filter", "/DecodeParms"})
                if (!push(one.getDict().getKey(key), other.getDict().getKey(key)))
                    return false;
            auto const bytes = one.getRawStreamData();
            auto const others = other.getRawStreamData();
            return bytes->getSize() == others->getSize() &&
                   std::equal(bytes->getBuffer(), bytes->getBuffer() + bytes->getSize(), others->getBuffer());
        }
        return unpacked(one) == unpacked(other);
    }

    static bool isPackedAlike(Handle one, Handle other) {
        auto const isAlike = [&](char const* key) {
            return one.getKey(key).unparseResolved() == other.getKey(key).unparseResolved();
        };
        return isAlike("/Filter") && isAlike("/DecodeParms");
    }

    /// Throws when it cannot be unpacked as it stands, or is too large.
    std::string unpacked(Handle stream) {
        Kept kept(unpackedLeft_);
        bool isUnpacked = false;
        if (!stream.pipeStreamData(&kept, &isUnpacked, 0, qpdf_dl_generalized, true, false) || !isUnpacked)
            throw std::runtime_error("cannot be unpacked");
        return std::move(kept.bytes);
    }

    bool pushAll(Handle one, Handle other, std::initializer_list<Keys const*> without) {
        Keys const keys = keysOf(one, without);
        return keys == keysOf(other, without) &&
               std::all_of(keys.begin(), keys.end(), [&](std::string const& key) {
                   return push(one.getKey(key), other.getKey(key), key);
               });
    }

    /// What stands under the key is compared later, once.
    bool push(Handle one, Handle other, std::string const& key = {}) {
        if (++parts_ > MAX_PARTS)
            return false;
        if (one.isStream() && OF_FONT_FILES.count(key) == 0 &&
            !one.getDict().getKey("/Subtype").isNameAndEquals("/Image"))
            contents_.emplace(one.getObjGen(), one);
        bool const isKnown = one.isIndirect() && other.isIndirect() && partnerOf_.count(one.getObjGen()) != 0;
        if (!arePartners(one, other))
            return false;
        if (!isKnown)
            waiting_.emplace_back(one, other);
        return true;
    }

    /// An object of one page is the same one of the other wherever it is named: layers are told by it.
    bool arePartners(Handle one, Handle other) {
        if (!one.isIndirect() || !other.isIndirect())
            return true;
        return partnerOf_.emplace(one.getObjGen(), other.getObjGen()).first->second == other.getObjGen() &&
               partnerBack_.emplace(other.getObjGen(), one.getObjGen()).first->second == one.getObjGen();
    }

    std::size_t parts_ = 0;
    std::size_t unpackedLeft_ = MAX_UNPACKED;
    bool hasFields_ = false;
    std::vector<Pair> waiting_;
    std::map<QPDFObjGen, QPDFObjGen> partnerOf_;
    std::map<QPDFObjGen, QPDFObjGen> partnerBack_;
    /// Of the document: streams that may hold operators.
    std::map<QPDFObjGen, Handle> contents_;
    /// Names of resources that only the document's page has.
    Keys dropped_;
};

void parse(QPDF& pdf, std::string_view bytes) {
    pdf.setSuppressWarnings(true);
    pdf.processMemoryFile("", bytes.data(), bytes.size());
}

/// Of several revisions readers may see different ones. A linearized file has two tables in one revision.
bool hasOneRevision(QPDF& pdf) {
    return pdf.isLinearized() || !(pdf.getTrailer().hasKey("/Prev") || pdf.getTrailer().hasKey("/XRefStm"));
}

} // namespace

struct PageObjects::Parsed {
    QPDF pdf;
    /// None of a document that is not looked into.
    std::vector<QPDFPageObjectHelper> pages;

    explicit Parsed(std::string_view bytes) {
        try {
            parse(pdf, bytes);
            if (hasOneRevision(pdf))
                pages = QPDFPageDocumentHelper(pdf).getAllPages();
        } catch (std::exception const&) {
            pages.clear();
        }
    }
};

PageObjects::PageObjects(std::string_view pdf) : pdf_(pdf) {}

PageObjects::~PageObjects() = default;

bool PageObjects::areSame(int number, std::string_view single) {
    try {
        if (!parsed_)
            parsed_ = std::make_unique<Parsed>(pdf_);
        QPDF written;
        parse(written, single);
        std::vector<QPDFPageObjectHelper> const others = QPDFPageDocumentHelper(written).getAllPages();
        if (others.size() != 1)
            return false;
        Comparison comparison;
        return comparison.areSame(parsed_->pages.at(static_cast<std::size_t>(number - 1)), others.front()) &&
               comparison.haveSameCatalogs(parsed_->pdf.getRoot(), written.getRoot()) &&
               comparison.needsNoMore() &&
               // What was mended while it was read may be read otherwise by others.
               parsed_->pdf.numWarnings() == 0 && written.numWarnings() == 0;
    } catch (std::exception const&) {
        return false;
    }
}

} // namespace Reader
