#pragma once
// The fields of a settings part: a value, or a list of elements, each knowing whether it is the node's own or
// comes from a parent node.

#include "vlservice/json/json.h"
#include "vlservice/json/json_form.h"
#include "vlservice/json/json_text.h"
#include "vlservice/json/record_keys.h"

#include <algorithm>
#include <concepts>
#include <cstddef>
#include <iterator>
#include <list>
#include <stdexcept>
#include <utility>

namespace Cfg {

/// One setting. `inh` tells that the value is not the node's own but inherited or a default.
template<typename T>
struct Value {
    T value{};       ///< what counts
    bool inh = true; ///< not the node's own
};

/// One element of a list setting. `inh` tells that it came from a parent node.
template<typename T>
struct ArrValue {
    T value{};        ///< what counts
    bool inh = false; ///< from a parent node
};

// On the wire an inherited value is wrapped: {"inh": true, "v": <plain value>}.
inline constexpr char const* INH_KEY = "inh"; ///< true in a wrapper
inline constexpr char const* VALUE_KEY = "v"; ///< what it wraps

/// An object whose "inh" is anything but true is no wrapper.
inline bool isWrapper(json::Value const& node) {
    return node.isObject() && node.toObject().get(INH_KEY).isTrue();
}
/// The plain value of a wrapper; the empty handle when there is none in it.
inline json::Value unwrap(json::Value const& wrapper) { return wrapper.toObject().get(VALUE_KEY); }
inline json::Value wrap(json::Value plain) {
    return json::Object{{INH_KEY, true}, {VALUE_KEY, std::move(plain)}};
}

namespace detail {

/// Element types with an order of their own are kept sorted by it where a caller asks for that.
template<typename T>
concept Ordered = requires(T const& element) {
    { element.order() } -> std::totally_ordered;
};

} // namespace detail

/// What stands in the part of the global root where nobody has set a value. Refers to an object that outlives
/// every part.
template<typename T>
struct RootDefault {
    T const& value; ///< has to outlive the parts
};
template<typename T>
RootDefault(T) -> RootDefault<T>;

/// A setting or a list of settings with its key; V is Value<T> or ArrValue<T>. The key is static text and is
/// not owned. In the reading operations the empty handle stands for a missing key. What is read is stored
/// only when all of it could be read, so that a field whose reading throws stays as it was.
template<typename T, typename V>
struct Field;

template<typename T>
struct Field<T, Value<T>> {
    using Type = T; ///< of the value, or of each element

    char const* key;  ///< static text
    Value<T> setting; ///< with where it comes from
    /// Null when the initial value counts at the root too.
    T const* rootDefault = nullptr;

    Field(char const* fieldKey, Value<T> initial = {}) : key(fieldKey), setting(std::move(initial)) {}
    Field(char const* fieldKey, RootDefault<T> atRoot) : key(fieldKey), rootDefault(&atRoot.value) {}

    json::KeyRow describe() const {
        json::Value const missing = json::Form<T>::write(rootDefault ? *rootDefault : setting.value);
        return {key, json::Form<T>::describe(), json::KeyUse::Checked, json::toText(missing),
                json::Inheritance::Whole};
    }

    /// Plain nodes are own values, wrapped ones inherited; a missing key keeps the value and makes it
    /// inherited.
    void deserialize(json::Value const& node, bool /*sorted*/) {
        if (!node)
            setting.inh = true;
        else if (isWrapper(node))
            setting = {json::Form<T>::read(unwrap(node)), true};
        else
            setting = {json::Form<T>::read(node), false};
    }

    /// Takes a parent's plain value where the own one is missing. Deliberately without a look for the
    /// wrapper: ancestors' documents are in the flat form, and a wrapper is a value of the wrong type.
    void deserializeParent(json::Value const& node, bool /*sorted*/) {
        if (setting.inh && node)
            setting.value = json::Form<T>::read(node);
    }

    void combineParent(Field const& parent) {
        if (setting.inh)
            setting.value = parent.setting.value;
    }

    /// The value stays nobody's own.
    void takeRootDefault() {
        if (setting.inh && rootDefault)
            setting.value = *rootDefault;
    }

    /// The empty handle when there is nothing to write.
    json::Value serialize(bool global) const {
        if (!setting.inh)
            return json::Form<T>::write(setting.value);
        return global ? wrap(json::Form<T>::write(setting.value)) : json::Value();
    }
};

/// A list is never inherited as a whole: own elements stand in front, inherited ones behind them. Elements
/// live in nodes of their own and are never assigned over each other, since they may hold what assignment
/// leaves alone.
template<typename T>
struct Field<T, ArrValue<T>> {
    using Type = T;                          ///< of the value, or of each element
    using Elements = std::list<ArrValue<T>>; ///< each in a node of its own

    char const* key;   ///< static text
    Elements elements; ///< own ones first

    Field(char const* fieldKey) : key(fieldKey) {}

    json::KeyRow describe() const {
        return {key,
                {json::KeyType::Records, json::Form<T>::describe().record},
                json::KeyUse::Checked,
                "[]",
                json::Inheritance::ByElements};
    }

    /// Adds to the list and never clears it. With `sorted`, elements with an order are put in front of the
    /// first one of greater order, so that equal ones keep their order of arrival.
    void deserialize(json::Value const& node, bool sorted) {
        Elements arrived = read(node);
        if constexpr (detail::Ordered<T>) {
            if (sorted)
                return insertByOrder(std::move(arrived));
        }
        elements.splice(elements.end(), arrived);
    }

    /// Adds a parent's elements, wrapped or not, as inherited ones. With `sorted`, elements with an order
    /// form a sorted run of their own right behind the leading own elements, in front of what earlier calls
    /// have added.
    void deserializeParent(json::Value const& node, bool sorted) {
        Elements arrived = read(node);
        for (ArrValue<T>& element : arrived)
            element.inh = true;
        auto place = elements.end();
        if constexpr (detail::Ordered<T>) {
            if (sorted) {
                arrived.sort(lessByOrder);
                place = firstInherited();
            }
        }
        elements.splice(place, arrived);
    }

    /// Replaces the first inherited element and all behind it by copies of the parent's whole list.
    void combineParent(Field const& parent) {
        Elements inherited = parent.elements;
        for (ArrValue<T>& element : inherited)
            element.inh = true;
        elements.erase(firstInherited(), elements.end());
        elements.splice(elements.end(), inherited);
    }

    /// The empty handle when there is nothing to write.
    json::Value serialize(bool global) const {
        json::Array array;
        for (ArrValue<T> const& element : elements) {
            if (!element.inh)
                array.append(json::Form<T>::write(element.value));
            else if (global)
                array.append(wrap(json::Form<T>::write(element.value)));
        }
        return array.empty() && !global ? json::Value() : array;
    }

    /// A list of the root is filled by its part.
    void takeRootDefault() {}

    void addOwn(T element) {
        auto const lastOwn = std::find_if(elements.rbegin(), elements.rend(), isOwn);
        elements.insert(lastOwn.base(), ArrValue<T>{std::move(element), false});
    }

    void addInherited(T element) { elements.push_back(ArrValue<T>{std::move(element), true}); }

    /// Throws std::out_of_range when there are not that many own elements.
    void eraseOwn(std::size_t position) {
        auto own = std::find_if(elements.begin(), elements.end(), isOwn);
        for (; own != elements.end() && position > 0; --position)
            own = std::find_if(std::next(own), elements.end(), isOwn);
        if (own == elements.end())
            throw std::out_of_range("There is no own element at this position");
        elements.erase(own);
    }

private:
    static bool isOwn(ArrValue<T> const& element) { return !element.inh; }
    static bool isInherited(ArrValue<T> const& element) { return element.inh; }
    static bool lessByOrder(ArrValue<T> const& a, ArrValue<T> const& b) {
        return a.value.order() < b.value.order();
    }

    auto firstInherited() { return std::find_if(elements.begin(), elements.end(), isInherited); }

    static Elements read(json::Value const& node) {
        Elements arrived;
        if (node) {
            for (json::Value const& element : node.toArray())
                arrived.push_back(readElement(element.toObject()));
        }
        return arrived;
    }

    static ArrValue<T> readElement(json::Object const& node) {
        if (isWrapper(node))
            return {json::Form<T>::read(unwrap(node).toObject()), true};
        return {json::Form<T>::read(node), false};
    }

    /// What inserting one element after the other gives, in one walk: a greater element never goes in front
    /// of where a smaller one went, so the sorted arrivals find their places from left to right. The list
    /// itself need not be sorted.
    void insertByOrder(Elements arrived) {
        arrived.sort(lessByOrder);
        auto place = elements.begin();
        while (!arrived.empty()) {
            while (place != elements.end() && !lessByOrder(arrived.front(), *place))
                ++place;
            elements.splice(place, arrived, arrived.begin());
        }
    }
};

} // namespace Cfg
