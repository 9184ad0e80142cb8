// Bytes to the door for metrics: what is as long as a request may be has an answer, each answer is one of a
// few of HTTP, and the page is given out for GET /metrics alone.

#include "programs/vlserviced/metrics/http_answer.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

namespace {

std::string page() { return "# EOF\n"; }

bool isAllowed(std::string_view answer) {
    for (std::string_view const status : {"200", "400", "404", "405", "431"})
        if (answer.starts_with("HTTP/1.1 " + std::string(status)))
            return true;
    return false;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string_view const bytes(reinterpret_cast<char const*>(data), size);
    std::optional<std::string> const whole = VlServiced::metricsAnswer(bytes, &page);
    if (size >= VlServiced::MAX_METRICS_REQUEST && !whole)
        std::abort();
    if (!whole)
        return 0;
    if (!isAllowed(*whole))
        std::abort();
    if (whole->ends_with("# EOF\n") && !bytes.starts_with("GET /metrics ") &&
        bytes.find("GET /metrics ") == std::string_view::npos)
        std::abort();
    return 0;
}
