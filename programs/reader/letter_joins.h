#pragma once
// Pages that joined the letter before them although they look like the first of another: the mark that
// should separate the two is not as its pattern has it.

#include "programs/reader/layout.h"
#include "programs/reader/pattern_time.h"
#include "programs/reader/trace.h"

#include "vlservice/extract/extract_preset.h"

#include <memory>
#include <string>
#include <vector>

namespace Reader {

struct DoubtfulJoin {
    /// That may begin another letter.
    int page = 0;
    /// What makes it look like that, as a clause.
    std::string says;
    /// Where that stands on the page.
    Box box = {};
};

/// Looks at all pages of a document whose letters are told apart by marks, and says which joins to doubt.
/// The evidence is strong: a page that repeats the head of its letter, or counts on, is never told.
class JoinWatch {
public:
    /// The preset and the rules must live longer.
    JoinWatch(Cfg::ExtractPreset const& preset, ReadingRules const& rules, PatternLimits const& limits);
    ~JoinWatch();

    /// The next page with what was searched on it.
    void see(Page const& page, Layout const& layout, PageTrace const& trace);
    /// In the order of the pages, when all have been seen.
    std::vector<DoubtfulJoin> doubtful() const;
    /// The page from which on there was no time left for marks; 0 when there was.
    int givenUpAt() const;

private:
    class Looks;
    std::unique_ptr<Looks> looks_;
};

} // namespace Reader
