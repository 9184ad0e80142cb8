#pragma once
// The departments that users pick from: one list, own or inherited as a whole.

#include "vlservice/cfg/part.h"
#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <concepts>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

namespace Cfg {

/// JSON: the bare name when there is no description, otherwise an object with "name" and "descrip".
class VLSERVICE_EXPORT Department {
public:
    Department() = default;
    Department(std::string name, std::string description)
        : name_(std::move(name)), description_(std::move(description)) {}
    /// Reads both forms; a description that is no text is empty. Throws json::Exc when there is no name.
    template<std::derived_from<json::Value> Node>
    Department(Node const& node) : Department(read(node)) {}

    std::string const& name() const { return name_; } ///< as people pick it
    std::string const& description() const { return description_; }
    /// "name = description", or the name alone when there is no description.
    std::string valForUI() const;
    json::Value serialize() const;
    static json::RecordKeys const& keys();
    friend bool operator==(Department const&, Department const&) = default;

    void changeName(std::string name) { name_ = std::move(name); } ///< the description stays

private:
    struct Keys;

    static Department read(json::Value const& node);

    std::string name_;
    std::string description_;
};

enum class VLSERVICE_EXPORT DepFieldIdxs { Vals };

using DepFields = std::tuple<Field<std::vector<Department>, Value<std::vector<Department>>>>;

extern template class VLSERVICE_EXPORT Part<DepFieldIdxs, DepFields>;

/// The part "deps".
class VLSERVICE_EXPORT Departments : public Part<DepFieldIdxs, DepFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();

    Departments(json::Value const& j, bool global, bool sorted);

    /// True when there is no department, own or inherited. An own empty list is own all the same.
    bool empty() const { return value<DepFieldIdxs::Vals>().empty(); }

private:
    static DepFields const FLDS_INIT;
};

} // namespace Cfg
