#include "programs/vlserviced/metrics/open_metrics.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace {

using prometheus::ClientMetric;
using prometheus::MetricFamily;
using prometheus::MetricType;
using VlServiced::openMetricsText;

MetricFamily familyOf(char const* name, MetricType type, ClientMetric const& metric) {
    return {name, "Helps.", type, {metric}};
}

TEST(OpenMetricsText, OfNothingIsItsEnd) { EXPECT_EQ(openMetricsText({}), "# EOF\n"); }

TEST(OpenMetricsText, OfACounterHasTheTotalInTheSampleAlone) {
    ClientMetric metric;
    metric.label = {{"reason", "rights"}, {"at", "door"}};
    metric.counter.value = 3;
    EXPECT_EQ(openMetricsText({familyOf("refused", MetricType::Counter, metric)}),
              "# TYPE refused counter\n"
              "# HELP refused Helps.\n"
              "refused_total{reason=\"rights\",at=\"door\"} 3\n"
              "# EOF\n");
}

TEST(OpenMetricsText, OfAGaugeSaysItsUnit) {
    ClientMetric metric;
    metric.gauge.value = 61'354'704'896;
    EXPECT_EQ(openMetricsText({familyOf("free_bytes", MetricType::Gauge, metric)}),
              "# TYPE free_bytes gauge\n"
              "# UNIT free_bytes bytes\n"
              "# HELP free_bytes Helps.\n"
              "free_bytes 61354704896\n"
              "# EOF\n");
}

TEST(OpenMetricsText, OfAHistogramHasItsBoundsWithAPoint) {
    ClientMetric metric;
    metric.label = {{"step", "packing"}};
    metric.histogram.sample_count = 3;
    metric.histogram.sample_sum = 2.75;
    metric.histogram.bucket = {{1, 0.00005}, {2, 1}, {3, std::numeric_limits<double>::infinity()}};
    EXPECT_EQ(openMetricsText({familyOf("step_seconds", MetricType::Histogram, metric)}),
              "# TYPE step_seconds histogram\n"
              "# UNIT step_seconds seconds\n"
              "# HELP step_seconds Helps.\n"
              "step_seconds_bucket{step=\"packing\",le=\"0.00005\"} 1\n"
              "step_seconds_bucket{step=\"packing\",le=\"1.0\"} 2\n"
              "step_seconds_bucket{step=\"packing\",le=\"+Inf\"} 3\n"
              "step_seconds_count{step=\"packing\"} 3\n"
              "step_seconds_sum{step=\"packing\"} 2.75\n"
              "# EOF\n");
}

TEST(OpenMetricsText, OfASummaryHasItsQuantiles) {
    ClientMetric metric;
    metric.summary.sample_count = 2;
    metric.summary.sample_sum = 1.5;
    metric.summary.quantile = {{0.5, 0.25}};
    EXPECT_EQ(openMetricsText({familyOf("size", MetricType::Summary, metric)}),
              "# TYPE size summary\n"
              "# HELP size Helps.\n"
              "size{quantile=\"0.5\"} 0.25\n"
              "size_count 2\n"
              "size_sum 1.5\n"
              "# EOF\n");
}

TEST(OpenMetricsText, OfWhatItsLabelsSayIsAnInfo) {
    ClientMetric metric;
    metric.label = {{"version", "1.2"}};
    metric.gauge.value = 1;
    EXPECT_EQ(openMetricsText({familyOf("build_info", MetricType::Gauge, metric)}),
              "# TYPE build info\n"
              "# HELP build Helps.\n"
              "build_info{version=\"1.2\"} 1\n"
              "# EOF\n");
}

TEST(OpenMetricsText, OfAnUntypedOneIsUnknown) {
    ClientMetric metric;
    metric.untyped.value = std::nan("");
    EXPECT_EQ(openMetricsText({familyOf("odd", MetricType::Untyped, metric)}),
              "# TYPE odd unknown\n# HELP odd Helps.\nodd NaN\n# EOF\n");
    metric.untyped.value = -std::numeric_limits<double>::infinity();
    EXPECT_EQ(openMetricsText({familyOf("odd", MetricType::Untyped, metric)}),
              "# TYPE odd unknown\n# HELP odd Helps.\nodd -Inf\n# EOF\n");
}

TEST(OpenMetricsText, HasWhatWouldEndATextOrALineEscaped) {
    ClientMetric metric;
    metric.label = {{"path", "a\"b\\c\nd"}};
    MetricFamily family = familyOf("x", MetricType::Gauge, metric);
    family.help = "One\ntwo \\ \"three\"";
    EXPECT_EQ(openMetricsText({family}), "# TYPE x gauge\n"
                                         "# HELP x One\\ntwo \\\\ \\\"three\\\"\n"
                                         "x{path=\"a\\\"b\\\\c\\nd\"} 0\n"
                                         "# EOF\n");
}

} // namespace
