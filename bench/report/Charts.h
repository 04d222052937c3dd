#ifndef QUELTA_BENCH_REPORT_CHARTS_H_
#define QUELTA_BENCH_REPORT_CHARTS_H_

// Charts as SVG text, to be put into one HTML page. Colours and fonts come from the page's style
// sheet: classes s0 to s7 colour the series, s0 being this system's.
// Pure functions; safe from any thread.

#include <string>
#include <utility>
#include <vector>

namespace report {

enum class Unit { NANOSECONDS, BYTES };

// "12.3 µs", "1.21 GB": three significant digits.
std::string human(double value, Unit unit);

// `text` with the characters that HTML reserves replaced.
std::string escaped(const std::string& text);

// One peer: its name, its colour (0 for this system, 1 to 7 for the others) and its (size, value)
// points by size.
struct Series {
    std::string name;
    int colour = 0;
    std::vector<std::pair<double, double>> points;
};

// One line per series over logarithmic axes, named at its right end.
std::string lineChart(const std::string& title, Unit unit, const std::vector<Series>& series);

// One value of a bar chart with the spread of its repetitions.
struct Bar {
    std::string name;
    bool ours = false;
    double value = 0;
    double low = 0;
    double high = 0;
};

// Horizontal bars in the given order, each with its value; a logarithmic scale with dots when the
// values differ by more than 40 times.
std::string barChart(const std::string& title, Unit unit, const std::vector<Bar>& bars);

}  // namespace report

#endif  // QUELTA_BENCH_REPORT_CHARTS_H_
