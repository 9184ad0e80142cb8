#include "programs/reader/printed_annotations.h"

#include <string>

namespace Reader {
namespace {

using Handle = QPDFObjectHandle;

constexpr int HIDDEN = 1 << 1;
constexpr int PRINT = 1 << 2;
constexpr int NO_VIEW = 1 << 5;

constexpr AnnotationKind KINDS[] = {
    {"/Text", "a note", true},      {"/FileAttachment", "an attached file", true},
    {"/Sound", "a sound", true},    {"/Movie", "a film", true},
    {"/Screen", "a film", true},    {"/RichMedia", "a film", true},
    {"/3D", "a model", true},       {"/Link", nullptr, false},
    {"/Popup", nullptr, false},     {"/PrinterMark", nullptr, false},
    {"/TrapNet", nullptr, false},   {"/FreeText", "a text", false},
    {"/Stamp", "a stamp", false},   {"/Widget", "a form's field", false},
    {"/Watermark", nullptr, false},
};

int flagsOf(Handle annotation) {
    Handle flags = annotation.getKey("/F");
    return flags.isInteger() ? flags.getIntValueAsInt() : 0;
}

bool isAnnotation(Handle annotation) {
    return annotation.isDictionary() && annotation.getKey("/Subtype").isName();
}

Handle annotationsOf(QPDFPageObjectHelper page) {
    Handle annotations = page.getObjectHandle().getKey("/Annots");
    return annotations.isArray() ? annotations : Handle::newArray();
}

} // namespace

AnnotationKind kindOf(Handle annotation) {
    std::string const subtype = annotation.getKey("/Subtype").getName();
    for (AnnotationKind const& kind : KINDS)
        if (subtype == kind.subtype)
            return kind;
    return {"", "a mark", false};
}

bool isOnScreen(Handle annotation) { return (flagsOf(annotation) & (HIDDEN | NO_VIEW)) == 0; }

bool isPrinted(Handle annotation) {
    return (flagsOf(annotation) & (HIDDEN | PRINT)) == PRINT && !kindOf(annotation).isNeverPrinted;
}

bool printsOtherAnnotations(QPDFPageObjectHelper page) {
    Handle annotations = annotationsOf(page);
    for (int i = 0; i < annotations.getArrayNItems(); ++i) {
        Handle annotation = annotations.getArrayItem(i);
        if (isAnnotation(annotation) && isOnScreen(annotation) != isPrinted(annotation))
            return true;
    }
    return false;
}

void keepPrintedAnnotations(QPDFPageObjectHelper page) {
    Handle annotations = annotationsOf(page);
    Handle printed = Handle::newArray();
    for (int i = 0; i < annotations.getArrayNItems(); ++i) {
        Handle annotation = annotations.getArrayItem(i);
        if (!isAnnotation(annotation) || !isPrinted(annotation))
            continue;
        annotation.replaceKey("/F", Handle::newInteger(flagsOf(annotation) & ~NO_VIEW));
        printed.appendItem(annotation);
    }
    if (annotations.getArrayNItems() > 0)
        page.getObjectHandle().replaceKey("/Annots", printed);
}

} // namespace Reader
