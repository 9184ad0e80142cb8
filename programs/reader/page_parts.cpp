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

std::vector<Handle> annotationsOf(QPDFPageObjectHelper page) {
    Handle annotations = page.getObjectHandle().getKey("/Annots");
    return annotations.isArray() ? annotations.getArrayAsVector() : std::vector<Handle>();
}

/// Follows what a page draws, by the names that its contents say.
class UsedNames {
public:
    UsedNames(QPDFPageObjectHelper page, PageContents& contents)
        : pageResources_(page.getAttribute("/Resources", false)) {
        follow(contents.ofPage(page), pageResources_);
        for (Handle const& annotation : annotationsOf(page))
            followAppearance(annotation);
        while (!waiting_.empty()) {
            auto const [content, resources] = std::move(waiting_.back());
            waiting_.pop_back();
            PageContents::Said const said = contents.of(content);
            follow(said, resources);
            follow(said, pageResources_);
        }
    }

    /// Otherwise there may be more.
    bool areAll() const { return areAll_; }
    bool areOfContentsWrittenAnew() const { return isWrittenAnew_; }
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

    void follow(PageContents::Said const& said, Handle resources) {
        std::set<std::string> const& names = said.names;
        names_.insert(names.begin(), names.end());
        areAll_ = areAll_ && said.isUnderstood;
        isWrittenAnew_ = isWrittenAnew_ || said.isWrittenAnew;
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
    bool areAll_ = true;
    bool isWrittenAnew_ = false;
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

bool dropUnusedResources(QPDFPageObjectHelper page, PageContents& contents) {
    bool isWrittenAnew = false;
    try {
        UsedNames const used(page, contents);
        isWrittenAnew = used.areOfContentsWrittenAnew();
        Handle resources = page.getAttribute("/Resources", false);
        if (!used.areAll() || !resources.isDictionary())
            return isWrittenAnew;
        resources = resources.shallowCopy();
        dropUnused(resources, "/Font", used);
        dropUnused(resources, "/XObject", used);
        page.getObjectHandle().replaceKey("/Resources", resources);
    } catch (std::exception const&) {
        // Too much is carried then, and nothing is lost.
    }
    return isWrittenAnew;
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

std::string bytesOf(QPDF& pdf, Packing packing) {
    QPDFWriter writer(pdf);
    if (packing == Packing::AsItIs)
        writer.setStreamDataMode(qpdf_s_preserve);
    writer.setOutputMemory();
    writer.setDeterministicID(true);
    writer.setObjectStreamMode(qpdf_o_generate);
    writer.write();
    auto const bytes = writer.getBufferSharedPointer();
    return std::string(reinterpret_cast<char const*>(bytes->getBuffer()), bytes->getSize());
}

} // namespace Reader
