#pragma once
// The base of all settings classes: a fixed, typed list of fields that is read from JSON, completed from a
// parent node and written back, field by field.

#include "vlservice/cfg/field.h"
#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"

#include <cstddef>
#include <tuple>
#include <utility>
#include <vector>

namespace Cfg {

/// One part of a node's settings: a plain value, used by one thread at a time. FieldIdxs names the positions
/// in the tuple of Field<T, Value<T>> (a setting) and Field<T, ArrValue<T>> (a list).
///
/// Each part is one table, FLDS_INIT: a row for each key, its member by position, its default. Its static
/// `keys()` gives the rows to those who check, show or describe settings.
///
/// A node's effective settings come about along Id::allIds, from the root towards the node, by one of two
/// routes: by combineParent with the complete part of each parent, or by deserializeParent with the JSON of
/// each ancestor.
template<typename FieldIdxs, typename Fields>
class Part {
    template<FieldIdxs I>
    using FieldAt = std::tuple_element_t<static_cast<std::size_t>(I), Fields>;
    template<FieldIdxs I>
    using TypeAt = typename FieldAt<I>::Type;

public:
    /// Whether inherited fields are written too: so it is for the part of the global root.
    bool global() const { return global_; }

    /// The current value, be it own, inherited or a default.
    template<FieldIdxs I>
    TypeAt<I> const& value() const {
        return at<I>().setting.value;
    }
    template<FieldIdxs I>
    bool isInherited() const {
        return at<I>().setting.inh;
    }
    /// The part's list of ArrValue, own elements in front of inherited ones.
    template<FieldIdxs I>
    auto const& elements() const {
        return at<I>().elements;
    }

    /// An object with the own fields and, in a global part, the inherited ones in wrapped form. The empty
    /// handle when there is nothing to write. An own value is written even when it equals the parent's.
    json::Value serialize() const {
        json::Object object;
        forEach([&](auto const& field) {
            if (json::Value const node = field.serialize(global_))
                object.set(field.key, node);
        });
        return object.empty() ? json::Value() : object;
    }

    /// Reads own and wrapped values; the empty handle changes nothing. Lists grow: a second call doubles
    /// them. With `sorted`, list elements that have an order are kept in it. Throws json::Exc on a wrong
    /// type; the fields ahead of the failing one are then changed already.
    void deserialize(json::Value const& j, bool sorted) {
        if (!j)
            return;
        json::Object const& object = j.toObject();
        forEach([&](auto& field) { field.deserialize(object.get(field.key), sorted); });
    }

    /// Takes what is not own from the JSON of one ancestor, which must be the flat form of a part that is not
    /// global: on a wrapped value it throws, and a wrapped Rect reads as zeroes. A key that is missing there
    /// keeps what the field has, so the last call that has the key decides. Lists grow with each call. Throws
    /// json::Exc like deserialize.
    void deserializeParent(json::Value const& parent, bool sorted) {
        if (!parent)
            return;
        json::Object const& object = parent.toObject();
        forEach([&](auto& field) { field.deserializeParent(object.get(field.key), sorted); });
    }

    /// Takes what is not own from the parent's part, which is expected to be complete. The inherited tail of
    /// a list is replaced, so that repeating the call changes nothing; an own element behind an inherited one
    /// is lost with it.
    void combineParent(Part const& parent) {
        if (&parent == this)
            return;
        combineFields(parent, std::make_index_sequence<std::tuple_size_v<Fields>>());
    }

    template<FieldIdxs I>
    void setOwn(TypeAt<I> newValue) {
        at<I>().setting = {std::move(newValue), false};
    }
    /// The value itself stays until the part is completed the next time.
    template<FieldIdxs I>
    void resetToInherited() {
        at<I>().setting.inh = true;
    }
    /// Puts an own element behind the last own one, in front of all when there is none.
    template<FieldIdxs I>
    void addOwn(TypeAt<I> element) {
        at<I>().addOwn(std::move(element));
    }
    /// Counts own elements alone. Throws std::out_of_range when there is none at that position.
    template<FieldIdxs I>
    void eraseOwn(std::size_t position) {
        at<I>().eraseOwn(position);
    }

protected:
    Part(bool global, Fields const& init) : global_(global), fields_(init) {}

    /// A part's class gives these out by its static keys().
    static json::RecordKeys keysOf(Fields const& init) {
        return {std::apply([](auto const&... field) { return std::vector{field.describe()...}; }, init)};
    }

    /// A value that is nobody's own: the field stays, or becomes, inherited.
    template<FieldIdxs I>
    void setDefault(TypeAt<I> newValue) {
        at<I>().setting = {std::move(newValue), true};
    }
    /// Each inherited value of the root becomes its default, also where it came from a wrapper.
    void takeRootDefaults() {
        forEach([](auto& field) { field.takeRootDefault(); });
    }
    /// Puts an inherited element behind all others.
    template<FieldIdxs I>
    void addInherited(TypeAt<I> element) {
        at<I>().addInherited(std::move(element));
    }

private:
    template<FieldIdxs I>
    FieldAt<I>& at() {
        return std::get<static_cast<std::size_t>(I)>(fields_);
    }
    template<FieldIdxs I>
    FieldAt<I> const& at() const {
        return std::get<static_cast<std::size_t>(I)>(fields_);
    }

    /// In declared order.
    template<typename Operation>
    void forEach(Operation operation) {
        std::apply([&](auto&... field) { (operation(field), ...); }, fields_);
    }
    template<typename Operation>
    void forEach(Operation operation) const {
        std::apply([&](auto const&... field) { (operation(field), ...); }, fields_);
    }
    template<std::size_t... Indices>
    void combineFields(Part const& parent, std::index_sequence<Indices...>) {
        (std::get<Indices>(fields_).combineParent(std::get<Indices>(parent.fields_)), ...);
    }

    bool global_;
    Fields fields_;
};

} // namespace Cfg
