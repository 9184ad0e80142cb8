#pragma once
// Metrics in the text form of OpenMetrics 1.0, which differs from the older one that their library writes.

#include <prometheus/metric_family.h>

#include <string>
#include <vector>

namespace VlServiced {

constexpr char const* OPEN_METRICS_TYPE = "application/openmetrics-text; version=1.0.0; charset=utf-8";

/// The families under their names, in their order, and the mark of the end. A counter's name has no "_total",
/// which its sample gets; one that ends in "_seconds" or "_bytes" has that unit, and a gauge whose name ends
/// in "_info" is what its labels say.
std::string openMetricsText(std::vector<prometheus::MetricFamily> const& families);

} // namespace VlServiced
