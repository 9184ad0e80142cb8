#include "programs/patterns/samples.h"

#include "programs/patterns/outline.h"
#include "programs/patterns/sampler.h"

#include <cstdint>
#include <utility>

namespace Patterns {

std::vector<std::string> samplesOf(Pattern const& pattern, std::size_t count) {
    auto const outline = outlineOf(pattern.text());
    Sampler sampler;
    std::vector<std::string> samples;
    std::size_t const tries = 3 * count + outline.size();
    for (std::uint64_t variant = 0; variant < tries && samples.size() < count; ++variant) {
        Choices choices(variant / outline.size());
        auto sample = sampler.sequence(outline[variant % outline.size()], choices);
        if (sample && pattern.fits(*sample) == Pattern::Answer::Yes)
            addUnique(samples, std::move(*sample));
    }
    return samples;
}

} // namespace Patterns
