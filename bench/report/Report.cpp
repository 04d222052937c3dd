// Usage: BenchReport results.csv report.html tables.md
//
// Turns the rows of a benchmark run into one HTML page with SVG charts that needs nothing else,
// and the same medians as Markdown tables.

#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <ctime>
#include <fstream>
#include <iostream>
#include <map>
#include <set>
#include <sstream>
#include <tuple>

#include "report/Charts.h"

namespace {

using report::Bar;
using report::Series;
using report::Unit;

// The repetitions of one metric.
using Values = std::vector<double>;
// A measurement of one peer: metric to repetitions.
using Metrics = std::map<std::string, Values>;

// What was measured, on how many patterns or bytes, by how many threads.
struct Place {
    std::string topic;
    double size = 0;
    int threads = 1;

    bool operator<(const Place& other) const {
        return std::tie(topic, size, threads) < std::tie(other.topic, other.size, other.threads);
    }
};

struct Results {
    std::map<Place, std::map<std::string, Metrics>> measured;
    std::map<std::string, std::set<std::string>> leftOut;  // "topic: peer" to reasons
};

// The names under which this system takes part; the first one that is present is the base of the
// ratios.
const std::vector<std::string> OURS = {
    "RuleSystem", "trie and matcher", "WildcardMatcher", "Logger", "Rete", "quelta"};

bool isOurs(const std::string& peer) {
    return std::find(OURS.begin(), OURS.end(), peer) != OURS.end();
}

// The same colour for a peer in every chart.
int colourOf(const std::string& peer) {
    static std::map<std::string, int> given;
    if (isOurs(peer)) {
        return 0;
    }
    return given.emplace(peer, static_cast<int>(given.size()) % 7 + 1).first->second;
}

double median(Values values) {
    std::sort(values.begin(), values.end());
    const std::size_t half = values.size() / 2;
    return values.size() % 2 == 1 ? values[half] : (values[half - 1] + values[half]) / 2;
}

Unit unitOf(const std::string& metric) {
    return metric.find("bytes") != std::string::npos ? Unit::BYTES : Unit::NANOSECONDS;
}

// Times and sizes with their unit, counts as they are.
std::string shown(const std::string& metric, double value) {
    if (metric.ends_with("_ns") || unitOf(metric) == Unit::BYTES) {
        return report::human(value, unitOf(metric));
    }
    std::ostringstream out;
    out << std::fixed;
    out.precision(value == static_cast<double>(static_cast<long>(value)) ? 0 : 2);
    out << value;
    return out.str();
}

Results read(const std::string& path) {
    std::ifstream in(path);
    Results out;
    std::string line;
    std::getline(in, line);  // the names of the columns
    while (std::getline(in, line)) {
        std::istringstream fields(line);
        std::string field[9];
        for (int i = 0; i < 8; ++i) {
            std::getline(fields, field[i], ',');
        }
        std::getline(fields, field[8]);
        if (field[6] == "left out") {
            out.leftOut[field[1] + ": " + field[2]].insert(field[8]);
            continue;
        }
        const Place place{field[1], std::atof(field[3].c_str()), std::atoi(field[4].c_str())};
        out.measured[place][field[2]][field[6]].push_back(std::atof(field[7].c_str()));
    }
    return out;
}

std::string firstLineWith(const char* path, const std::string& key) {
    std::ifstream in(path);
    for (std::string line; std::getline(in, line);) {
        if (line.rfind(key, 0) == 0) {
            const std::size_t colon = line.find(':');
            return line.substr(line.find_first_not_of(" \t", colon + 1));
        }
    }
    return "unknown";
}

std::string machine() {
    utsname system{};
    ::uname(&system);
    char day[32] = "";
    const std::time_t now = std::time(nullptr);
    std::tm utc{};
    ::gmtime_r(&now, &utc);
    std::strftime(day, sizeof(day), "%Y-%m-%d", &utc);
    return firstLineWith("/proc/cpuinfo", "model name") + ", " +
           std::to_string(::sysconf(_SC_NPROCESSORS_ONLN)) + " processors, memory " +
           firstLineWith("/proc/meminfo", "MemTotal") + ", " + system.sysname + ' ' +
           system.release + ", compiler " + __VERSION__ + ", " + day;
}

std::vector<Bar> barsOf(const std::map<std::string, Metrics>& peers, const std::string& metric) {
    std::vector<Bar> bars;
    for (const auto& [peer, metrics] : peers) {
        const auto found = metrics.find(metric);
        if (found == metrics.end()) {
            continue;
        }
        const Values& values = found->second;
        bars.push_back({peer, isOurs(peer), median(values),
                        *std::min_element(values.begin(), values.end()),
                        *std::max_element(values.begin(), values.end())});
    }
    std::sort(bars.begin(), bars.end(),
              [](const Bar& a, const Bar& b) { return a.value < b.value; });
    return bars;
}

std::string growthChart(const Results& results, const std::string& topic, const std::string& metric,
                        const std::string& title) {
    std::map<std::string, Series> byPeer;
    for (const auto& [place, peers] : results.measured) {
        for (const auto& [peer, metrics] : peers) {
            const auto found = metrics.find(metric);
            if (place.topic == topic && found != metrics.end()) {
                Series& one = byPeer[peer];
                one.name = peer;
                one.colour = colourOf(peer);
                // A build too small for a page shows as one page.
                one.points.emplace_back(place.size, std::max(median(found->second), 1.0));
            }
        }
    }
    std::vector<Series> series;
    for (auto& [peer, one] : byPeer) {
        series.push_back(one);
    }
    return series.empty() ? "" : report::lineChart(title, unitOf(metric), series);
}

// One bar chart for every place of the topic.
std::string bars(const Results& results, const std::string& topic, const std::string& metric,
                 const std::string& title) {
    std::string out;
    for (const auto& [place, peers] : results.measured) {
        if (place.topic != topic) {
            continue;
        }
        std::string full = title;
        full += place.size > 0 ? ", " + shown("", place.size) + " bytes" : "";
        full += place.threads > 1 ? ", " + std::to_string(place.threads) + " threads" : "";
        const std::vector<Bar> list = barsOf(peers, metric);
        out += list.empty() ? "" : report::barChart(full, unitOf(metric), list);
    }
    return out;
}

std::string charts(const Results& results) {
    std::string out = "<h2>The program</h2><div class='row'>";
    out += bars(results, "whole process", "time_ns", "Whole process, wall time");
    out += "</div><h2>Sets of patterns</h2><div class='row'>";
    const std::string own = "set of program";
    out += growthChart(results, own, "time_ns", "Building the program's patterns");
    out += growthChart(results, own, "bytes", "Memory of the program's patterns");
    out += growthChart(results, own, "lookup_ns", "Looking up the program's term");
    out += growthChart(results, own, "span_ns", "Lookup that collects its matches");
    out += growthChart(results, "set of urls", "lookup_ns", "Looking up a URL among prefixes");
    out += growthChart(results, "set of urls", "time_ns", "Building the URL prefixes");
    out += growthChart(results, "set of urls", "bytes", "Memory of the URL prefixes");
    for (const auto& [place, peers] : results.measured) {
        if (place.topic == "set of short terms") {
            out += report::barChart("One short term among " + shown("", place.size) + " patterns",
                                    Unit::NANOSECONDS, barsOf(peers, "lookup_ns"));
        }
    }
    out += "</div><h2>One pattern, one text</h2><div class='row'>";
    for (const char* topic : {"short word", "short hit", "middle found", "middle missing",
                              "start and end", "start and middle and end", "run of one letter"}) {
        out += bars(results, topic, "time_ns", topic);
    }
    out += "</div><h2>Logging</h2><div class='row'>";
    out += bars(results, "log line plain", "time_ns", "A line, message only");
    out += bars(results, "log line date", "time_ns", "A line with date, level and category");
    out += bars(results, "suppressed message", "time_ns", "A suppressed message");
    return out + "</div>";
}

// A table row for each place and peer, its metrics as columns, times as ratios to this system's.
using Row = std::vector<std::string>;

std::vector<Row> tableOf(const Results& results, const std::string& topic) {
    std::set<std::string> metrics;
    for (const auto& [place, peers] : results.measured) {
        for (const auto& [peer, values] : peers) {
            for (const auto& [metric, list] : values) {
                if (place.topic == topic) {
                    metrics.insert(metric);
                }
            }
        }
    }
    std::vector<Row> rows(1, Row{"size", "threads", "peer"});
    rows[0].insert(rows[0].end(), metrics.begin(), metrics.end());
    for (const auto& [place, peers] : results.measured) {
        if (place.topic != topic) {
            continue;
        }
        const auto base = std::find_if(OURS.begin(), OURS.end(), [&peers = peers](const auto& one) {
            return peers.find(one) != peers.end();
        });
        for (const auto& [peer, values] : peers) {
            Row row{shown("", place.size), std::to_string(place.threads), peer};
            for (const std::string& metric : metrics) {
                const auto found = values.find(metric);
                if (found == values.end()) {
                    row.emplace_back("");
                    continue;
                }
                const double value = median(found->second);
                std::string cell = shown(metric, value);
                if (base != OURS.end() && peer != *base && peers.at(*base).count(metric) != 0 &&
                    (metric.ends_with("_ns") || unitOf(metric) == Unit::BYTES)) {
                    const double own = median(peers.at(*base).at(metric));
                    char ratio[32];
                    std::snprintf(ratio, sizeof(ratio), " (%.3gx)", value / own);
                    cell += own > 0 ? ratio : "";
                }
                row.push_back(cell);
            }
            rows.push_back(row);
        }
    }
    return rows;
}

void writeTable(std::ostream& html, std::ostream& markdown, const std::string& topic,
                const std::vector<Row>& rows) {
    html << "<h3>" << report::escaped(topic) << "</h3><table>\n";
    markdown << "\n## " << topic << "\n\n";
    for (std::size_t i = 0; i < rows.size(); ++i) {
        html << "<tr>";
        markdown << '|';
        for (const std::string& cell : rows[i]) {
            html << (i == 0 ? "<th>" : "<td>") << report::escaped(cell);
            markdown << ' ' << cell << " |";
        }
        html << "</tr>\n";
        markdown << '\n';
        if (i == 0) {
            markdown << '|';
            for (std::size_t j = 0; j < rows[i].size(); ++j) {
                markdown << "---|";
            }
            markdown << '\n';
        }
    }
    html << "</table>\n";
}

const char* const STYLE = R"(
:root { --back: #fcfcfb; --ink: #1d1d1b; --soft: #6b6b66; --grid: #e4e4df;
  --c0: #c2410c; --c1: #2a6fbb; --c2: #1a8a72; --c3: #8a5cc2; --c4: #b8860b; --c5: #5b7083;
  --c6: #a83279; --c7: #4d7c0f; }
@media (prefers-color-scheme: dark) { :root { --back: #1a1a19; --ink: #ecece6; --soft: #a3a39b;
  --grid: #33332f; --c0: #fb923c; --c1: #6aaef0; --c2: #4fc5a8; --c3: #b895e8; --c4: #e0b040;
  --c5: #9fb3c5; --c6: #e27bb8; --c7: #a3d05a; } }
body { background: var(--back); color: var(--ink); font: 15px/1.5 system-ui, sans-serif;
  max-width: 1400px; margin: 2rem auto; padding: 0 1rem; }
.row { display: flex; flex-wrap: wrap; gap: 1.5rem; }
figure { margin: 0; flex: 1 1 560px; max-width: 680px; }
figcaption { font-weight: 600; margin-bottom: .4rem; }
svg { width: 100%; height: auto; font-size: 12px; overflow: visible; }
.grid { stroke: var(--grid); } .tick { fill: var(--soft); } .label { fill: var(--ink); }
.line { fill: none; stroke-width: 2; } .lead { stroke-width: 1; opacity: .5; }
.dot { stroke: var(--back); stroke-width: 1; }
.second { stroke-dasharray: 5 4; } .dot.second { stroke-dasharray: none; }
table { border-collapse: collapse; font-size: 13px; font-variant-numeric: tabular-nums; }
td, th { padding: .2rem .7rem; border-bottom: 1px solid var(--grid); text-align: right; }
td:nth-child(3), th:nth-child(3) { text-align: left; } .wide { overflow-x: auto; }
)";

std::string seriesStyle() {
    std::string out;
    for (int i = 0; i < 8; ++i) {
        const std::string colour = std::to_string(i);
        out += ".line.s" + colour + ",.lead.s" + colour + "{stroke:var(--c" + colour + ")}.dot.s" +
               colour + ",.bar.s" + colour + "{fill:var(--c" + colour + ")}\n";
    }
    return out + ".label.s0 { fill: var(--c0); font-weight: 600; }";
}

void write(const Results& results, std::ostream& html, std::ostream& markdown) {
    html << "<!doctype html><html lang='en'><meta charset='utf-8'>"
            "<meta name='viewport' content='width=device-width'><title>Quelta benchmarks</title>"
            "<style>"
         << STYLE << seriesStyle() << "</style><h1>Quelta benchmarks</h1><p>"
         << report::escaped(machine())
         << "</p><p>Medians of the repetitions; hover a mark for its numbers. Smaller is better "
            "everywhere.</p>\n"
         << charts(results) << "<h2>Left out</h2><ul>\n";
    markdown << "Machine: " << machine() << "\n";
    for (const auto& [peer, reasons] : results.leftOut) {
        for (const std::string& reason : reasons) {
            html << "<li>" << report::escaped(peer + ": " + reason) << "</li>\n";
            markdown << "\nLeft out: " << peer << ": " << reason << "\n";
        }
    }
    html << "</ul><h2>Tables</h2><div class='wide'>\n";
    std::set<std::string> topics;
    for (const auto& [place, peers] : results.measured) {
        topics.insert(place.topic);
    }
    for (const std::string& topic : topics) {
        writeTable(html, markdown, topic, tableOf(results, topic));
    }
    html << "</div></html>\n";
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 4) {
        std::fprintf(stderr, "Usage: %s results.csv report.html tables.md\n", argv[0]);
        return 2;
    }
    const Results results = read(argv[1]);
    if (results.measured.empty()) {
        std::fprintf(stderr, "%s: no results in %s\n", argv[0], argv[1]);
        return 1;
    }
    std::ofstream html(argv[2]);
    std::ofstream markdown(argv[3]);
    write(results, html, markdown);
    return html.flush() && markdown.flush() ? 0 : 1;
}
