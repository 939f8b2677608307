/// Reads what a host tells a monitoring system, and finds what breaks the format's rules.
#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

/// A page in Prometheus' text format, version 0.0.4.
class MetricsPage {
public:
    explicit MetricsPage(const std::string& text);

    /// What is wrong with it, a sentence each: lines of no known form, samples that no metric
    /// announces, series that come twice, histograms whose buckets do not add up.
    const std::vector<std::string>& faults() const { return faults_; }
    /// The metrics' types by their names.
    const std::map<std::string, std::string>& types() const { return types_; }
    bool has(const std::string& series) const { return values_.count(series) != 0; }
    /// The value of a series, such as `jobs_total{kind="a"}`; -1 if it is not there.
    double value(const std::string& series) const;
    std::size_t series() const { return values_.size(); }

private:
    void read(const std::string& line);
    void readHead(const std::string& line);
    void readSample(const std::string& line);
    bool belongs(const std::string& name) const;
    void checkHistograms();
    void complain(const std::string& what, const std::string& line);

    std::string metric_;  ///< to which the samples belong now
    std::set<std::string> helped_;
    std::map<std::string, std::string> types_;
    std::map<std::string, double> values_;
    std::vector<std::string> faults_;
    /// Of each histogram's series without "le": its last bucket so far.
    std::map<std::string, double> buckets_;
    std::map<std::string, double> infinities_;
};
