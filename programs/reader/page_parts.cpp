#include "programs/reader/page_parts.h"

#include <qpdf/Buffer.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFWriter.hh>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;

class NameCollector : public Handle::ParserCallbacks {
public:
    void handleObject(Handle object) override {
        if (object.isName())
            names.insert(object.getName());
    }
    void handleEOF() override {}

    std::set<std::string> names;
};

std::vector<Handle> annotationsOf(QPDFPageObjectHelper page) {
    Handle annotations = page.getObjectHandle().getKey("/Annots");
    return annotations.isArray() ? annotations.getArrayAsVector() : std::vector<Handle>();
}

/// Follows what a page draws, by the names that its contents say.
class UsedNames {
public:
    explicit UsedNames(QPDFPageObjectHelper page) : pageResources_(page.getAttribute("/Resources", false)) {
        NameCollector collector;
        page.parseContents(&collector);
        follow(collector.names, pageResources_);
        for (Handle const& annotation : annotationsOf(page))
            followAppearance(annotation);
        while (!waiting_.empty()) {
            auto [content, resources] = std::move(waiting_.back());
            waiting_.pop_back();
            NameCollector inner;
            content.parseAsContents(&inner);
            follow(inner.names, resources);
            follow(inner.names, pageResources_);
        }
    }

    bool contains(std::string const& name) const { return names_.count(name) != 0; }

private:
    void followAppearance(Handle annotation) {
        if (!annotation.isDictionary() || !annotation.getKey("/AP").isDictionary())
            return;
        Handle normal = annotation.getKey("/AP").getKey("/N");
        draw(normal);
        if (normal.isDictionary())
            for (auto const& state : normal.ditems())
                draw(state.second);
    }

    void follow(std::set<std::string> const& names, Handle resources) {
        names_.insert(names.begin(), names.end());
        if (!resources.isDictionary())
            return;
        for (char const* const kind : {"/XObject", "/Pattern", "/Font", "/ExtGState"}) {
            Handle all = resources.getKey(kind);
            if (!all.isDictionary())
                continue;
            for (auto const& item : all.ditems())
                if (names.count(item.first) != 0)
                    draw(item.second);
        }
    }

    /// What has content of its own is looked through once.
    void draw(Handle object) {
        if (object.isIndirect() && !seen_.insert(object.getObjGen()).second)
            return;
        if (object.isStream() && !object.getDict().getKey("/Subtype").isNameAndEquals("/Image"))
            waiting_.emplace_back(object, object.getDict().getKey("/Resources"));
        else if (object.isDictionary() && object.getKey("/CharProcs").isDictionary())
            for (auto const& glyph : object.getKey("/CharProcs").ditems())
                if (Handle(glyph.second).isStream())
                    waiting_.emplace_back(glyph.second, object.getKey("/Resources"));
        if (object.isDictionary() && object.getKey("/SMask").isDictionary())
            draw(object.getKey("/SMask").getKey("/G"));
    }

    Handle pageResources_;
    std::set<std::string> names_;
    std::set<QPDFObjGen> seen_;
    /// Contents with the resources that they name.
    std::vector<std::pair<Handle, Handle>> waiting_;
};

void dropUnused(Handle resources, char const* kind, UsedNames const& used) {
    Handle all = resources.getKey(kind);
    if (!all.isDictionary())
        return;
    Handle kept = Handle::newDictionary();
    for (auto const& item : all.ditems())
        if (used.contains(item.first))
            kept.replaceKey(item.first, item.second);
    resources.replaceKey(kind, kept);
}

bool isWidget(Handle annotation) {
    return annotation.isDictionary() && annotation.getKey("/Subtype").isNameAndEquals("/Widget");
}

void separate(Handle field) {
    std::set<QPDFObjGen> seen;
    Handle parent = field.getKey("/Parent");
    while (parent.isDictionary() && seen.insert(parent.getObjGen()).second) {
        for (char const* const key : {"/FT", "/T", "/V", "/DV", "/Ff", "/DA", "/Q", "/MaxLen", "/Opt"})
            if (!field.hasKey(key) && parent.hasKey(key))
                field.replaceKey(key, parent.getKey(key));
        parent = parent.getKey("/Parent");
    }
    field.removeKey("/Parent");
}

/// A copy that can be carried to another document.
Handle indirect(QPDF& document, Handle object) { return document.makeIndirectObject(object.shallowCopy()); }

void carryForm(QPDF& document, QPDF& single, QPDFPageObjectHelper page) {
    Handle form = document.getRoot().getKey("/AcroForm");
    Handle fields = Handle::newArray();
    for (Handle const& annotation : annotationsOf(page))
        if (isWidget(annotation) && annotation.isIndirect())
            fields.appendItem(annotation);
    if (!form.isDictionary() || fields.getArrayNItems() == 0)
        return;
    Handle source = indirect(document, form);
    for (char const* const key : {"/Fields", "/XFA", "/CO"})
        source.removeKey(key);
    Handle carried = single.copyForeignObject(source);
    carried.replaceKey("/Fields", fields);
    single.getRoot().replaceKey("/AcroForm", carried);
}

} // namespace

void dropUnusedResources(QPDFPageObjectHelper page) {
    try {
        UsedNames const used(page);
        Handle resources = page.getAttribute("/Resources", false);
        if (!resources.isDictionary())
            return;
        resources = resources.shallowCopy();
        dropUnused(resources, "/Font", used);
        dropUnused(resources, "/XObject", used);
        page.getObjectHandle().replaceKey("/Resources", resources);
    } catch (std::exception const&) {
        // Too much is carried then, and nothing is lost.
    }
}

void dropLostContents(QPDFPageObjectHelper page) {
    Handle contents = page.getObjectHandle().getKey("/Contents");
    if (!contents.isArray())
        return;
    Handle kept = Handle::newArray();
    for (Handle part : contents.getArrayAsVector())
        if (part.isStream())
            kept.appendItem(part);
    page.getObjectHandle().replaceKey("/Contents", kept);
}

void separateFormFields(QPDFPageObjectHelper page) {
    for (Handle const& annotation : annotationsOf(page))
        if (isWidget(annotation))
            separate(annotation);
}

void carryCatalog(QPDF& document, QPDF& single, QPDFPageObjectHelper page) {
    Handle layers = document.getRoot().getKey("/OCProperties");
    if (layers.isDictionary())
        single.getRoot().replaceKey("/OCProperties", single.copyForeignObject(indirect(document, layers)));
    carryForm(document, single, page);
}

std::string bytesOf(QPDF& pdf) {
    QPDFWriter writer(pdf);
    writer.setOutputMemory();
    writer.setDeterministicID(true);
    writer.setObjectStreamMode(qpdf_o_generate);
    writer.write();
    auto const bytes = writer.getBufferSharedPointer();
    return std::string(reinterpret_cast<char const*>(bytes->getBuffer()), bytes->getSize());
}

} // namespace Reader
