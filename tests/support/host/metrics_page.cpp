#include "support/host/metrics_page.h"

#include <cstdlib>
#include <regex>
#include <sstream>

namespace {

const std::string kName = "[a-zA-Z_:][a-zA-Z0-9_:]*";
const std::string kLabel = "[a-zA-Z_][a-zA-Z0-9_]*=\"(?:[^\"\\\\\\n]|\\\\[\\\\\"n])*\"";

/// Name, labels with their braces, value.
const std::regex& sampleForm() {
    static const std::regex form("(" + kName + ")(\\{" + kLabel + "(?:," + kLabel +
                                 ")*\\})? (NaN|[+-]Inf|-?[0-9]+(?:\\.[0-9]+)?(?:e[+-]?[0-9]+)?)");
    return form;
}

/// The series without its label "le", which stands last.
std::string withoutBound(const std::string& labels) {
    const std::size_t at = labels.rfind("le=\"");
    if (at == std::string::npos) return labels;
    const std::string rest = labels.substr(0, at - 1);
    return rest.empty() ? "" : rest + "}";
}

}  // namespace

MetricsPage::MetricsPage(const std::string& text) {
    if (text.empty() || text.back() != '\n') complain("the page does not end with a line feed", "");
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);)
        read(line);
    checkHistograms();
}

double MetricsPage::value(const std::string& series) const {
    const auto found = values_.find(series);
    return found == values_.end() ? -1 : found->second;
}

void MetricsPage::complain(const std::string& what, const std::string& line) {
    faults_.push_back(what + ": " + line);
}

void MetricsPage::read(const std::string& line) {
    if (line.rfind("# ", 0) == 0) {
        readHead(line);
    } else {
        readSample(line);
    }
}

void MetricsPage::readHead(const std::string& line) {
    static const std::regex help("# HELP (" + kName + ") (?:[^\\\\]|\\\\[\\\\n])+");
    static const std::regex type("# TYPE (" + kName + ") (counter|gauge|histogram)");
    std::smatch parts;
    if (std::regex_match(line, parts, help)) {
        if (!helped_.insert(parts[1]).second) complain("a second HELP", line);
    } else if (std::regex_match(line, parts, type)) {
        metric_ = parts[1];
        if (helped_.count(metric_) == 0) complain("a TYPE without HELP above it", line);
        if (!types_.emplace(metric_, parts[2]).second) complain("a second TYPE", line);
        const bool isTotal = metric_.size() > 6 && metric_.substr(metric_.size() - 6) == "_total";
        if (isTotal != (parts[2] == "counter")) complain("only counters end with _total", line);
    } else {
        complain("no HELP and no TYPE", line);
    }
}

bool MetricsPage::belongs(const std::string& name) const {
    const auto type = types_.find(metric_);
    if (type == types_.end()) return false;
    if (type->second != "histogram") return name == metric_;
    return name == metric_ + "_bucket" || name == metric_ + "_sum" || name == metric_ + "_count";
}

void MetricsPage::readSample(const std::string& line) {
    std::smatch parts;
    if (!std::regex_match(line, parts, sampleForm())) return complain("no sample", line);
    const std::string name = parts[1];
    const std::string labels = parts[2];
    const double value = std::strtod(parts[3].str().c_str(), nullptr);
    if (!belongs(name)) complain("a sample of another metric", line);
    if (!values_.emplace(name + labels, value).second) complain("a series twice", line);
    if (name != metric_ + "_bucket") return;
    const std::string series = metric_ + withoutBound(labels);
    const auto last = buckets_.find(series);
    if (last != buckets_.end() && value < last->second) complain("a bucket that shrinks", line);
    if (infinities_.count(series) != 0) complain("a bucket behind the last one", line);
    buckets_[series] = value;
    if (labels.find("le=\"+Inf\"") != std::string::npos) infinities_[series] = value;
}

void MetricsPage::checkHistograms() {
    for (const auto& [series, last] : buckets_) {
        const std::size_t brace = series.find('{');
        const std::string name = series.substr(0, brace);
        const std::string labels = brace == std::string::npos ? "" : series.substr(brace);
        if (infinities_.count(series) == 0) complain("a histogram without its last bucket", series);
        if (!has(name + "_sum" + labels)) complain("a histogram without its sum", series);
        if (value(name + "_count" + labels) != last) complain("a count that differs", series);
    }
}
