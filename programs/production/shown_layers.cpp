#include "programs/production/shown_layers.h"

#include <qpdf/QPDFObjectHandle.hh>

#include <set>
#include <string>

namespace Production {
namespace {

using Handle = QPDFObjectHandle;

std::set<QPDFObjGen> listed(Handle array) {
    std::set<QPDFObjGen> all;
    if (array.isArray())
        for (Handle const& item : array.getArrayAsVector())
            if (item.isIndirect())
                all.insert(item.getObjGen());
    return all;
}

/// As the default configuration has it.
class Visibility {
public:
    explicit Visibility(Handle properties)
        : configuration_(properties.getKey("/D")), isOff_(keyOf("/BaseState").isNameAndEquals("/OFF")),
          others_(listed(keyOf(isOff_ ? "/ON" : "/OFF"))) {}

    bool shows(Handle layer) const { return isOff_ == (others_.count(layer.getObjGen()) != 0); }

private:
    Handle keyOf(char const* key) {
        return configuration_.isDictionary() ? configuration_.getKey(key) : Handle::newNull();
    }

    Handle configuration_;
    bool isOff_;
    std::set<QPDFObjGen> others_;
};

/// A dictionary or an array that is there, or is made.
template<typename Make>
Handle partOf(Handle dictionary, char const* key, bool (Handle::*isOne)(), Make const& make) {
    if (!(dictionary.getKey(key).*isOne)())
        dictionary.replaceKey(key, make());
    return dictionary.getKey(key);
}

Handle dictionaryIn(Handle dictionary, char const* key) {
    return partOf(dictionary, key, &Handle::isDictionary, [] { return Handle::newDictionary(); });
}

Handle arrayIn(Handle dictionary, char const* key) {
    return partOf(dictionary, key, &Handle::isArray, [] { return Handle::newArray(); });
}

} // namespace

void showLayersOf(QPDF& laid, QPDF& on) {
    Handle source = laid.getRoot().getKey("/OCProperties");
    if (!source.isDictionary() || !source.getKey("/OCGs").isArray())
        return;
    Visibility const visibility(source);
    Handle properties = dictionaryIn(on.getRoot(), "/OCProperties");
    Handle configuration = dictionaryIn(properties, "/D");
    for (Handle layer : source.getKey("/OCGs").getArrayAsVector()) {
        if (!layer.isIndirect() || !layer.isDictionary())
            continue;
        Handle const copy = on.copyForeignObject(layer);
        arrayIn(properties, "/OCGs").appendItem(copy);
        arrayIn(configuration, visibility.shows(layer) ? "/ON" : "/OFF").appendItem(copy);
    }
}

} // namespace Production
