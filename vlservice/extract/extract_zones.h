#pragma once
// The zones of one extraction preset, in order, and questions over all of them.

#include "vlservice/export.h"
#include "vlservice/extract/extract_zone.h"

#include <string>
#include <utility>
#include <vector>

namespace Cfg {

/// A list of zones with the whole interface of a vector.
class VLSERVICE_EXPORT ExtractZones : public std::vector<ExtractZone> {
public:
    /// The name of the automatic field with which a client marks documents that hold one letter only.
    static std::string const SINGLE_LTR_FLD_NAME;

    using std::vector<ExtractZone>::vector;
    explicit ExtractZones(std::vector<ExtractZone> zones) : std::vector<ExtractZone>(std::move(zones)) {}

    /// The first field of exactly that name, zone by zone; null when there is none.
    ExtractField const* findField(std::string const& name) const;
    /// As findField, but throws std::runtime_error when there is none.
    ExtractField const& field(std::string const& name) const;

    /// Whether the first zone holds the automatic single-letter field; other zones are not looked at.
    /// The odd spelling is the interface's.
    bool hasSinlgeLetterField() const;
    /// Adds the automatic field to the first zone, which is made if there is none, or takes the first such
    /// field out of it. The other fields go on answering by their own patterns.
    void setSingleLetterField(bool isSingle);

private:
    void addSingleLetterField();
    void eraseSingleLetterField();
};

} // namespace Cfg
