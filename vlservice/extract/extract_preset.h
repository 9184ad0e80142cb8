#pragma once
// How one kind of document is to be read: which documents, by their names, and with which zones and reader
// parameters.

#include "vlservice/export.h"
#include "vlservice/extract/extract_zones.h"
#include "vlservice/extract/regex_cache.h"
#include "vlservice/json/json.h"

#include <cstdint>
#include <memory>
#include <string>
#include <utility>

/// What a preset is for. A number without a name is kept and is for neither.
enum class ExtractPresetType : std::int32_t { Letters = 0, Attachments = 1 };

/// Acted on by the reader; numbers without a name are kept.
enum class OcrMode : std::int32_t { Default = 0 };

/// The text engine's page granularity. Acted on by the reader; numbers without a name are kept.
enum class TETPageOption : std::int32_t { Default = 0 };

namespace Cfg {

/// Binds an expression over document names to a pack preset, to the parameters of the text reader and to
/// zones.
///
/// Copies have zones of their own and start without a compiled expression. Once a preset has matched a name
/// it goes on matching by the same expression, whatever is set or assigned, until it is rebuilt: this is
/// deliberate, see RegexCache. Order, last use and the deletion mark are bookkeeping and can be changed
/// through a const object. One thread at a time.
class VLSERVICE_EXPORT ExtractPreset {
public:
    /// The order of presets that are not read from JSON. The library only reads it; a program may write it.
    static int MAX_ORDER;
    static constexpr double MAX_SPACES_BETWEEN_FRAGS_DEFAULT = 3.0; ///< widths of a blank
    static constexpr double LINE_DISTANCE_MAX_DEFAULT = 1.8;        ///< font sizes

    ExtractPreset() = default;
    ExtractPreset(std::string const& regex, std::string const& packPreset,
                  std::shared_ptr<ExtractZones> zones);
    ExtractPreset(bool useFieldsOnly, bool skipImages, bool skipFirstPage,
                  std::shared_ptr<ExtractZones> zones);
    /// A missing "order" is 0. Throws json::Exc when "zones" is there and cannot be read; every other key has
    /// a default.
    ExtractPreset(json::Object const& object);

    // Matching throws boost::regex_error for a bad expression, std::runtime_error for one too complex for the
    // name, and std::out_of_range for an expression or a name that is not UTF-8.

    /// Whether the expression fits the whole name, without regard to case; "." fits any character. An empty
    /// expression fits the empty name only. Compiles at first use.
    bool match(std::string const& name) const;
    /// The same with an expression that is compiled for this one call.
    static bool match(std::string const& regex, std::string const& name);
    /// Whether the expression was compiled, and so goes on answering whatever is set or assigned.
    bool isCompiled() const { return compiledMatch_.isFilled(); }

    /// Equality of what the preset does: all but name, expression, order and pack preset. The time of the
    /// last use counts.
    bool compareSettings(ExtractPreset const& other) const;
    bool operator==(ExtractPreset const& other) const;

    /// "match" is always there; other keys that hold their default are left out. A preset that is marked for
    /// deletion is written as "match", "order" and the mark alone.
    json::Object serialize() const;
    static json::RecordKeys const& keys();

    /// Smaller is tried first.
    int order() const { return order_; }
    std::string const& name() const { return name_; }
    std::string const& packPresetName() const { return packPreset_; }
    /// The expression over the whole of a document's name.
    std::string const& strRegex() const { return match_; }
    ExtractPresetType type() const { return type_; }
    bool isForLetters() const { return type_ == ExtractPresetType::Letters; } ///< what it reads are letters
    /// The odd spelling is the interface's.
    bool isForAttachemnt() const { return type_ == ExtractPresetType::Attachments; }
    bool useFieldsOnly() const { return useFieldsOnly_; }
    OcrMode ocrMode() const { return ocrMode_; }
    std::uint32_t ocrTestPages() const { return ocrTestPages_; }
    TETPageOption tetPageOption() { return tetPageOption_; }
    /// In per cent.
    int spaceAdjustPerc() const { return spaceAdjustPerc_; }
    bool noSpacesInFrags() const { return noSpacesInFrags_; }
    bool trimFrags() const { return trimFrags_; }
    bool skipImagesAndFontNames() const { return skipImages_; }
    int sigThresholdAdjust() const { return signatureAdjust_; }
    bool skipFirstPage() const { return skipFirstPage_; }
    std::uint32_t retryOnRepeated() const { return retryOnRepeated_; }
    double maxSpacesBetweenFrags() const { return maxSpacesBetweenFrags_; }
    double maxLineDistance() const { return maxLineDistance_; }
    /// Seconds since the epoch; 0 is never.
    long long lastUsedAt() const { return lastUsed_; }
    bool lastUsedIsSet() const { return lastUsed_ != 0; } ///< it was used
    bool eraseMe() const { return eraseMe_; }
    /// Makes an empty list where there is none; the const form does too.
    ExtractZones& zones() { return zones_.list(); }
    ExtractZones const& zones() const { return zones_.list(); }

    void setOrder(int order) const { order_ = order; }
    void setName(std::string name) { name_ = std::move(name); }
    void setPackPreset(std::string name) { packPreset_ = std::move(name); }
    /// The text alone: a preset that has matched goes on matching by its former expression, which is
    /// deliberate.
    void setRegex(std::string regex) { match_ = std::move(regex); }
    void setType(ExtractPresetType type) { type_ = type; }
    void setUseFieldsOnly(bool fieldsOnly) { useFieldsOnly_ = fieldsOnly; }
    void setOcrMode(OcrMode mode) { ocrMode_ = mode; }
    void setOcrTestPages(std::uint32_t pages) { ocrTestPages_ = pages; }
    void setTetPageOption(TETPageOption option) { tetPageOption_ = option; }
    void setSpaceAdjustPerc(int perCent) { spaceAdjustPerc_ = perCent; }
    void setNoSpacesInFrags(bool noSpaces) { noSpacesInFrags_ = noSpaces; }
    void setTrimFrags(bool trim) { trimFrags_ = trim; }
    void setSkipImagesAndFontNames(bool skip) { skipImages_ = skip; }
    void setSigThresholdAdjust(int adjust) { signatureAdjust_ = adjust; }
    void setSkipFirstPage(bool skip) { skipFirstPage_ = skip; }
    void setRetryOnRepeated(std::uint32_t retries) { retryOnRepeated_ = retries; }
    void setMaxSpacesBetweenFrags(double spaces) { maxSpacesBetweenFrags_ = spaces; }
    void setMaxLineDistance(double distance) { maxLineDistance_ = distance; }
    void setEraseMe(bool erase) const { eraseMe_ = erase; }
    /// Last used now.
    void resetLastUsed() const;
    void deleteLastUsed() { lastUsed_ = 0; } ///< as if it was never used
    /// Makes of this a preset for exactly that document name, with a pack preset named after it and used just
    /// now, so that it can age out. As with setRegex, what has matched goes on matching by its former
    /// expression.
    void setAsAutoExpireFor(std::string const& name);

private:
    struct Keys;

    /// The list of zones, or none, which is as good as an empty list. A copy has a list of its own, or none.
    class VLSERVICE_EXPORT OwnedZones {
    public:
        OwnedZones() noexcept = default;
        OwnedZones(std::shared_ptr<ExtractZones> zones) noexcept : zones_(std::move(zones)) {}
        /// Throws json::Exc for anything but an array of zones.
        explicit OwnedZones(json::Value const& node);
        OwnedZones(OwnedZones const& other);
        OwnedZones(OwnedZones&& other) noexcept = default;
        OwnedZones& operator=(OwnedZones const& other);
        OwnedZones& operator=(OwnedZones&& other) noexcept = default;

        bool empty() const { return !zones_ || zones_->empty(); }
        ExtractZones& list() const;
        bool operator==(OwnedZones const& other) const;
        json::Value serialize() const;
        static json::KeyForm describe() { return {json::KeyType::Records, &ExtractZone::keys()}; }

    private:
        mutable std::shared_ptr<ExtractZones> zones_;
    };

    bool hasZones() const { return !zones_.empty(); }
    NameRegex const& regex() const;
    static std::string escapeSpecialRegexChars(std::string text);

    mutable int order_ = MAX_ORDER;
    std::string match_;
    RegexCache<NameRegex> compiledMatch_;
    std::string packPreset_;
    std::string name_;
    ExtractPresetType type_ = ExtractPresetType::Letters;
    bool useFieldsOnly_ = false;
    OcrMode ocrMode_ = OcrMode::Default;
    std::uint32_t ocrTestPages_ = 0;
    TETPageOption tetPageOption_ = TETPageOption::Default;
    int spaceAdjustPerc_ = 0;
    bool noSpacesInFrags_ = false;
    bool trimFrags_ = false;
    bool skipImages_ = false;
    int signatureAdjust_ = 0;
    std::uint32_t retryOnRepeated_ = 0;
    bool skipFirstPage_ = false;
    double maxSpacesBetweenFrags_ = MAX_SPACES_BETWEEN_FRAGS_DEFAULT; ///< widths of a blank
    double maxLineDistance_ = LINE_DISTANCE_MAX_DEFAULT;              ///< font sizes
    OwnedZones zones_;
    mutable long long lastUsed_ = 0;
    mutable bool eraseMe_ = false;
};

} // namespace Cfg
