#pragma once
// What is said to whoever asks for metrics by HTTP.

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace VlServiced {

/// Of a request; more is refused.
constexpr std::size_t MAX_METRICS_REQUEST = 8192;

/// The whole answer to what has been received of a request until now; nothing while more of it is to come.
/// `page` is called for GET /metrics alone. All else is answered by its status and one line. The connection
/// ends behind any answer.
std::optional<std::string> metricsAnswer(std::string_view received, std::function<std::string()> const& page);

} // namespace VlServiced
