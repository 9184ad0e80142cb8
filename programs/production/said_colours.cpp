#include "programs/production/said_colours.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QPDFPageObjectHelper.hh>

#include <set>
#include <stdexcept>
#include <utility>
#include <vector>

namespace Production {
namespace {

using Handle = QPDFObjectHandle;

/// Contents with more objects are drawn.
constexpr std::size_t MAX_OBJECTS = 200'000;

/// Ends the search: there may be colour.
struct MayBe : std::runtime_error {
    MayBe() : std::runtime_error("colour") {}
};

void require(bool isGrey) {
    if (!isGrey)
        throw MayBe();
}

bool isGreySpace(Handle space) {
    if (space.isName())
        return space.isNameAndEquals("/DeviceGray") || space.isNameAndEquals("/CalGray");
    return space.isArray() && space.getArrayNItems() > 0 && space.getArrayItem(0).isNameAndEquals("/CalGray");
}

/// Takes the operators of one content, and gathers the forms and pictures that it names.
class Operators : public Handle::ParserCallbacks {
public:
    explicit Operators(std::size_t& objects) : objects_(objects) {}

    void handleObject(Handle object) override {
        require(++objects_ <= MAX_OBJECTS);
        if (!object.isOperator()) {
            operands_.push_back(object);
            return;
        }
        take(object.getOperatorValue());
        operands_.clear();
    }
    void handleEOF() override {}

    std::vector<std::string> drawn;

private:
    void take(std::string const& name) {
        if (name == "rg" || name == "RG")
            require(operands_.size() == 3 && number(0) == number(1) && number(1) == number(2));
        else if (name == "k" || name == "K")
            require(operands_.size() == 4 && number(0) == 0 && number(1) == 0 && number(2) == 0);
        else if (name == "cs" || name == "CS")
            require(operands_.size() == 1 && isGreySpace(operands_[0]));
        else if (name == "sc" || name == "SC" || name == "scn" || name == "SCN")
            require(operands_.size() == 1 && operands_[0].isNumber());
        else if (name == "Do")
            drawn.push_back(operands_.size() == 1 && operands_[0].isName() ? operands_[0].getName() : "");
        else
            require(name != "sh" && name != "BI");
    }

    double number(std::size_t at) { return operands_[at].isNumber() ? operands_[at].getNumericValue() : -1; }

    std::size_t& objects_;
    std::vector<Handle> operands_;
};

class Search {
public:
    explicit Search(QPDFPageObjectHelper page) {
        Handle annotations = page.getObjectHandle().getKey("/Annots");
        require(!annotations.isArray() || annotations.getArrayNItems() == 0);
        Operators operators(objects_);
        page.parseContents(&operators);
        follow(operators.drawn, page.getAttribute("/Resources", false));
        while (!forms_.empty()) {
            Handle form = forms_.back();
            forms_.pop_back();
            Operators inner(objects_);
            form.parseAsContents(&inner);
            // A form without resources of its own takes the page's, which nobody writes any more.
            require(form.getDict().getKey("/Resources").isDictionary() || inner.drawn.empty());
            follow(inner.drawn, form.getDict().getKey("/Resources"));
        }
    }

private:
    void follow(std::vector<std::string> const& names, Handle resources) {
        if (!resources.isDictionary())
            return require(names.empty());
        requireGreyFonts(resources.getKey("/Font"));
        requireGreySpaces(resources.getKey("/ColorSpace"));
        require(!resources.getKey("/ExtGState").isDictionary() ||
                resources.getKey("/ExtGState").getKeys().empty() ||
                areHarmless(resources.getKey("/ExtGState")));
        Handle objects = resources.getKey("/XObject");
        for (std::string const& name : names)
            draw(objects.isDictionary() ? objects.getKey(name) : Handle::newNull());
    }

    void draw(Handle object) {
        require(object.isStream());
        if (!seen_.insert(object.getObjGen()).second)
            return;
        Handle keys = object.getDict();
        if (keys.getKey("/Subtype").isNameAndEquals("/Form")) {
            forms_.push_back(object);
            return;
        }
        Handle mask = keys.getKey("/ImageMask");
        require(keys.getKey("/Subtype").isNameAndEquals("/Image") &&
                (isGreySpace(keys.getKey("/ColorSpace")) || (mask.isBool() && mask.getBoolValue())));
    }

    /// Glyphs that are drawn by contents may have colours of their own.
    static void requireGreyFonts(Handle fonts) {
        if (!fonts.isDictionary())
            return;
        for (std::string const& name : fonts.getKeys()) {
            Handle font = fonts.getKey(name);
            require(font.isDictionary() && !font.getKey("/Subtype").isNameAndEquals("/Type3"));
        }
    }

    /// Those that stand for the greys of a page may be anything.
    static void requireGreySpaces(Handle spaces) {
        if (spaces.isDictionary())
            for (char const* const name : {"/DefaultGray", "/DefaultRGB", "/DefaultCMYK"})
                require(!spaces.hasKey(name));
    }

    static bool areHarmless(Handle states) {
        for (std::string const& name : states.getKeys()) {
            Handle state = states.getKey(name);
            for (char const* const key : {"/Font", "/SMask", "/TR", "/TR2"})
                if (!state.isDictionary() || (state.hasKey(key) && !state.getKey(key).isName()))
                    return false;
        }
        return true;
    }

    std::size_t objects_ = 0;
    std::set<QPDFObjGen> seen_;
    std::vector<Handle> forms_;
};

} // namespace

bool maySayColour(std::string const& pdf) {
    try {
        QPDF parsed;
        parsed.setSuppressWarnings(true);
        parsed.processMemoryFile("page", pdf.data(), pdf.size());
        Search const search(QPDFPageDocumentHelper(parsed).getAllPages().at(0));
        return false;
    } catch (std::exception const&) {
        return true;
    }
}

} // namespace Production
