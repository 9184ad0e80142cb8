#pragma once
// What a look at settings finds, in words: severity, place, what will happen, and what to do.

#include "programs/vlmail/presets/place.h"

#include <span>
#include <string>
#include <vector>

namespace VlMail {

enum class Severity { Error, Warning };

/// Every kind of finding; its words stand in finding.cpp, in this order.
enum class FindingKind {
    // Keys and types.
    UnknownPart,
    MisspeltKey,
    UnknownKey,
    DuplicateKey,
    DroppedKey,
    MissingKey,
    WrongType,
    RefusedType,
    CutNumber,
    UnknownNumber,
    CarriedOnly,
    // Lists of presets.
    EmptyMatch,
    MatchWithoutEnding,
    UnreachablePreset,
    ShadowedPreset,
    OrderTie,
    LastOrder,
    ErasedPresetMatches,
    PackPresetMissing,
    PackPresetNotNamed,
    PackPresetTwice,
    PackPresetUnused,
    ErasedPackPresetUsed,
    ProcessModeRefused,
    LetterheadLosesKeys,
    DelayImpossible,
    EmailMalformed,
    ConfirmationNotSent,
    // Patterns.
    PatternBroken,
    RunawayPattern,
    SlowPattern,
    ValueGroupMissing,
    PatternNotComposed,
    // Zones.
    ZoneOffPage,
    ZoneBeyondPage,
    ZoneEmpty,
    ZoneTiny,
    ZonesOverlap,
    ZonesAtOnePoint,
    PointOffPage,
    ZoneWithoutFields,
    // Fields.
    FieldNameTwice,
    FieldPriorityTwice,
    AddressNotSent,
    NoAddress,
    NeverFound,
    NameLowered,
    WidthTiny,
    TypeOverruled,
    RealsNotMerged,
    // Values.
    DefaultDropped,
    DefaultIgnored,
    DefaultRefused,
    LimitIgnored,
    LimitCut,
    LimitsCrossed,
    DateWithoutYear,
    NumberWithoutMinimum,
    DecimalComma,
    // How documents are read.
    ReadingRefused,
    ReadingZoneMissing,
    ReadingAgainstMatch,
    ReadingMarkElsewhere,
    // What is printed.
    ProductionRefused,
    PrintAreaEmpty,
    COUNT_,
};

/// The words of a kind. "{0}" and so on stand for what is told when it is found.
struct FindingWords {
    FindingKind kind;
    /// Stable, for programs.
    char const* id;
    Severity severity;
    char const* what;
    char const* advice;
};

/// One row a kind, in the order of FindingKind.
std::span<FindingWords const> findingWords();

struct Finding {
    FindingKind kind;
    Place place;
    /// What will happen, and what to do about it.
    std::string what;
    std::string advice;

    char const* id() const;
    Severity severity() const;
};

/// Findings in the making.
class Findings {
public:
    /// The arguments are those of the kind's words.
    void add(FindingKind kind, Place const& place, std::vector<std::string> const& arguments = {});

    /// Errors first, then in the order of their places, which is natural: "/2" comes before "/10".
    std::vector<Finding> sorted() const;

private:
    std::vector<Finding> findings_;
};

char const* inWords(Severity severity);

} // namespace VlMail
