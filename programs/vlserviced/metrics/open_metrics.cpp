#include "programs/vlserviced/metrics/open_metrics.h"

#include <array>
#include <charconv>
#include <cmath>
#include <string_view>

namespace VlServiced {
namespace {

using prometheus::ClientMetric;
using prometheus::MetricFamily;
using prometheus::MetricType;
using Labels = std::vector<ClientMetric::Label>;

constexpr std::string_view INFO = "_info";

std::string numberText(double number) {
    if (std::isnan(number))
        return "NaN";
    if (std::isinf(number))
        return number > 0 ? "+Inf" : "-Inf";
    // Of times and sizes people want to see all digits.
    if (std::abs(number) < 1e15 && number == std::floor(number))
        return std::to_string(static_cast<long long>(number));
    std::array<char, 32> room;
    return {room.data(), std::to_chars(room.data(), room.data() + room.size(), number).ptr};
}

/// As the bound of a bucket is written: with a point.
std::string boundText(double bound) {
    if (std::isinf(bound))
        return numberText(bound);
    std::array<char, 400> room;
    std::string const text(
        room.data(),
        std::to_chars(room.data(), room.data() + room.size(), bound, std::chars_format::fixed).ptr);
    return text.find('.') == std::string::npos ? text + ".0" : text;
}

std::string escaped(std::string_view text) {
    std::string escaped;
    for (char const c : text)
        if (c == '\n')
            escaped += "\\n";
        else
            escaped += (c == '\\' || c == '"' ? "\\" : "") + std::string(1, c);
    return escaped;
}

bool isInfo(MetricFamily const& family) {
    return family.type == MetricType::Gauge && family.name.ends_with(INFO);
}

std::string nameOf(MetricFamily const& family) {
    return isInfo(family) ? family.name.substr(0, family.name.size() - INFO.size()) : family.name;
}

std::string_view typeOf(MetricFamily const& family) {
    switch (family.type) {
    case MetricType::Counter:
        return "counter";
    case MetricType::Gauge:
        return isInfo(family) ? "info" : "gauge";
    case MetricType::Histogram:
        return "histogram";
    case MetricType::Summary:
        return "summary";
    case MetricType::Untyped:
        break;
    }
    return "unknown";
}

/// The samples of one family.
class Samples {
public:
    Samples(std::string& text, MetricFamily const& family) : text_(text), family_(family) {}

    void write() {
        for (ClientMetric const& metric : family_.metric)
            write(metric);
    }

private:
    void write(ClientMetric const& metric) {
        switch (family_.type) {
        case MetricType::Counter:
            return line("_total", metric.label, metric.counter.value);
        case MetricType::Gauge:
            return line("", metric.label, metric.gauge.value);
        case MetricType::Histogram:
            return writeHistogram(metric);
        case MetricType::Summary:
            return writeSummary(metric);
        case MetricType::Untyped:
            return line("", metric.label, metric.untyped.value);
        }
    }

    void writeHistogram(ClientMetric const& metric) {
        for (ClientMetric::Bucket const& bucket : metric.histogram.bucket)
            line("_bucket", with(metric.label, "le", boundText(bucket.upper_bound)),
                 static_cast<double>(bucket.cumulative_count));
        line("_count", metric.label, static_cast<double>(metric.histogram.sample_count));
        line("_sum", metric.label, metric.histogram.sample_sum);
    }

    void writeSummary(ClientMetric const& metric) {
        for (ClientMetric::Quantile const& one : metric.summary.quantile)
            line("", with(metric.label, "quantile", boundText(one.quantile)), one.value);
        line("_count", metric.label, static_cast<double>(metric.summary.sample_count));
        line("_sum", metric.label, metric.summary.sample_sum);
    }

    static Labels with(Labels labels, char const* name, std::string value) {
        labels.push_back({name, std::move(value)});
        return labels;
    }

    void line(std::string_view suffix, Labels const& labels, double value) {
        text_.append(family_.name).append(suffix);
        char separator = '{';
        for (ClientMetric::Label const& label : labels) {
            text_ += separator;
            text_.append(label.name).append("=\"").append(escaped(label.value)) += '"';
            separator = ',';
        }
        text_.append(labels.empty() ? " " : "} ").append(numberText(value)) += '\n';
    }

    std::string& text_;
    MetricFamily const& family_;
};

void writeHead(std::string& text, MetricFamily const& family) {
    std::string const name = nameOf(family);
    text.append("# TYPE ").append(name).append(" ").append(typeOf(family)) += '\n';
    for (std::string_view const unit : {"seconds", "bytes"})
        if (name.ends_with('_' + std::string(unit)))
            text.append("# UNIT ").append(name).append(" ").append(unit) += '\n';
    text.append("# HELP ").append(name).append(" ").append(escaped(family.help)) += '\n';
}

} // namespace

std::string openMetricsText(std::vector<MetricFamily> const& families) {
    std::string text;
    for (MetricFamily const& family : families) {
        writeHead(text, family);
        Samples(text, family).write();
    }
    return text + "# EOF\n";
}

} // namespace VlServiced
