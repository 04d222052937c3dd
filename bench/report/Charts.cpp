#include "report/Charts.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace report {
namespace {

std::string number(double value) {
    char text[32];
    std::snprintf(text, sizeof(text), "%.1f", value);
    return text;
}

std::string textAt(double x, double y, const char* anchor, const std::string& classes,
                   const std::string& text) {
    return "<text x='" + number(x) + "' y='" + number(y) + "' text-anchor='" + anchor +
           "' class='" + classes + "'>" + escaped(text) + "</text>\n";
}

std::string line(double x1, double y1, double x2, double y2, const std::string& classes) {
    return "<line x1='" + number(x1) + "' y1='" + number(y1) + "' x2='" + number(x2) + "' y2='" +
           number(y2) + "' class='" + classes + "'/>\n";
}

std::string dot(double x, double y, const std::string& classes, const std::string& hint) {
    return "<circle cx='" + number(x) + "' cy='" + number(y) + "' r='4' class='dot " + classes +
           "'><title>" + escaped(hint) + "</title></circle>\n";
}

std::string frame(const std::string& title, double width, double height, const std::string& body) {
    return "<figure><figcaption>" + escaped(title) + "</figcaption><svg viewBox='0 0 " +
           number(width) + ' ' + number(height) + "' role='img' aria-label='" + escaped(title) +
           "'>\n" + body + "</svg></figure>\n";
}

// A logarithmic axis over whole decades, or fractions of one when the values lie close together.
struct LogAxis {
    double low;
    double high;
    double start;   // pixel of `low`
    double length;  // pixels, negative upwards

    double at(double value) const {
        return start + length * (std::log10(value) - low) / (high - low);
    }
};

LogAxis axisOver(double least, double most, double start, double length) {
    LogAxis axis{std::floor(std::log10(least)), std::ceil(std::log10(most)), start, length};
    if (axis.high <= axis.low) {
        axis.high = axis.low + 1;
    }
    return axis;
}

// Digits in groups of three.
std::string plainCount(double value) {
    char text[32];
    const int length = std::snprintf(text, sizeof(text), "%.0f", value);
    std::string out;
    for (int i = 0; i < length; ++i) {
        out += i > 0 && (length - i) % 3 == 0 ? "," : "";
        out += text[i];
    }
    return out;
}

// Pushes labels apart that would overlap, keeping their order.
void spread(std::vector<double>& places, double gap) {
    std::vector<std::size_t> order(places.size());
    for (std::size_t i = 0; i < order.size(); ++i) {
        order[i] = i;
    }
    std::sort(order.begin(), order.end(),
              [&](std::size_t a, std::size_t b) { return places[a] < places[b]; });
    for (std::size_t i = 1; i < order.size(); ++i) {
        places[order[i]] = std::max(places[order[i]], places[order[i - 1]] + gap);
    }
}

// "100 µs" for the fifth power of ten nanoseconds.
std::string decadeName(double decade, Unit unit) {
    std::string text = human(std::pow(10, decade), unit);
    if (const std::size_t point = text.find('.'); point != std::string::npos) {
        text.erase(point, text.find(' ') - point);
    }
    return text;
}

constexpr double LEFT = 70;
constexpr double TOP = 12;
constexpr double PLOT_WIDTH = 400;
constexpr double PLOT_HEIGHT = 280;

std::string grid(const LogAxis& x, const LogAxis& y, Unit unit) {
    std::string out;
    for (double decade = y.low; decade <= y.high; ++decade) {
        const double value = std::pow(10, decade);
        out += line(LEFT, y.at(value), LEFT + PLOT_WIDTH, y.at(value), "grid");
        out += textAt(LEFT - 8, y.at(value) + 4, "end", "tick", decadeName(decade, unit));
    }
    for (double decade = x.low; decade <= x.high; ++decade) {
        const double value = std::pow(10, decade);
        out += line(x.at(value), TOP, x.at(value), TOP + PLOT_HEIGHT, "grid");
        out += textAt(x.at(value), TOP + PLOT_HEIGHT + 18, "middle", "tick", plainCount(value));
    }
    return out + textAt(LEFT + PLOT_WIDTH / 2, TOP + PLOT_HEIGHT + 36, "middle", "tick",
                        "patterns in the set");
}

std::string curve(const Series& one, const std::string& colour, const LogAxis& x, const LogAxis& y,
                  Unit unit) {
    std::string points;
    std::string dots;
    for (const auto& [size, value] : one.points) {
        points += number(x.at(size)) + ',' + number(y.at(value)) + ' ';
        dots += dot(x.at(size), y.at(value), colour,
                    one.name + ", " + plainCount(size) + ": " + human(value, unit));
    }
    return "<polyline points='" + points + "' class='line " + colour + "'/>\n" + dots;
}

}  // namespace

std::string human(double value, Unit unit) {
    static const char* const TIMES[] = {"ns", "µs", "ms", "s"};
    static const char* const SIZES[] = {"B", "kB", "MB", "GB"};
    int step = 0;
    while (value >= 999.5 && step < 3) {
        value /= 1000;
        ++step;
    }
    const int decimals = value >= 99.95 ? 0 : value >= 9.995 ? 1 : 2;
    char text[48];
    std::snprintf(text, sizeof(text), "%.*f %s", decimals, value,
                  unit == Unit::BYTES ? SIZES[step] : TIMES[step]);
    return text;
}

std::string escaped(const std::string& text) {
    std::string out;
    for (const char c : text) {
        out += c == '<'    ? "&lt;"
               : c == '>'  ? "&gt;"
               : c == '&'  ? "&amp;"
               : c == '\'' ? "&#39;"
                           : std::string(1, c);
    }
    return out;
}

std::string lineChart(const std::string& title, Unit unit, const std::vector<Series>& series) {
    double least[2] = {1e300, 1e300};
    double most[2] = {1, 1};
    for (const Series& one : series) {
        for (const auto& [size, value] : one.points) {
            least[0] = std::min(least[0], size);
            most[0] = std::max(most[0], size);
            least[1] = std::min(least[1], value);
            most[1] = std::max(most[1], value);
        }
    }
    const LogAxis x = axisOver(least[0], most[0], LEFT, PLOT_WIDTH);
    const LogAxis y = axisOver(least[1], most[1], TOP + PLOT_HEIGHT, -PLOT_HEIGHT);
    std::vector<std::string> colour;
    bool second = false;  // this system's further series are dashed
    for (const Series& one : series) {
        colour.push_back('s' + std::to_string(one.colour));
        colour.back() += one.colour == 0 && second ? " second" : "";
        second = second || one.colour == 0;
    }
    std::string body = grid(x, y, unit);
    std::vector<double> places;
    for (std::size_t i = 0; i < series.size(); ++i) {
        body += curve(series[i], colour[i], x, y, unit);
        places.push_back(y.at(series[i].points.back().second));
    }
    spread(places, 15);
    const double right = LEFT + PLOT_WIDTH;
    for (std::size_t i = 0; i < series.size(); ++i) {
        const auto& [size, value] = series[i].points.back();
        body += line(x.at(size) + 6, y.at(value), right + 14, places[i], "lead " + colour[i]);
        body += textAt(right + 18, places[i] + 4, "start", "label " + colour[i], series[i].name);
    }
    const double lowest = *std::max_element(places.begin(), places.end()) + 20;
    return frame(title, right + 180, std::max(TOP + PLOT_HEIGHT + 44, lowest), body);
}

std::string barChart(const std::string& title, Unit unit, const std::vector<Bar>& bars) {
    double least = 1e300;
    double most = 0;
    for (const Bar& bar : bars) {
        least = std::min(least, bar.value);
        most = std::max(most, bar.value);
    }
    const bool logarithmic = most > 40 * least;
    const double left = 180;
    const LogAxis axis = axisOver(least, most, left, PLOT_WIDTH);
    const double scale = PLOT_WIDTH / most;
    const double bottom = 30 * static_cast<double>(bars.size()) + 6;
    std::string body;
    for (double decade = axis.low; logarithmic && decade <= axis.high; ++decade) {
        const double x = axis.at(std::pow(10, decade));
        body += line(x, 0, x, bottom, "grid");
        body += textAt(x, bottom + 14, "middle", "tick", decadeName(decade, unit));
    }
    double y = 18;
    for (const Bar& bar : bars) {
        const std::string colour = bar.ours ? "s0" : "s1";
        const double end = logarithmic ? axis.at(bar.value) : left + bar.value * scale;
        const std::string hint = bar.name + ": " + human(bar.value, unit) + " (" +
                                 human(bar.low, unit) + " to " + human(bar.high, unit) + ")";
        body += textAt(left - 8, y + 4, "end", "label", bar.name);
        if (logarithmic) {
            body += dot(end, y, colour, hint);
        } else {
            body += "<rect x='" + number(left) + "' y='" + number(y - 9) + "' width='" +
                    number(end - left) + "' height='18' rx='2' class='bar " + colour + "'><title>" +
                    escaped(hint) + "</title></rect>\n";
        }
        body += textAt(end + 8, y + 4, "start", "tick", human(bar.value, unit));
        y += 30;
    }
    return frame(title, left + PLOT_WIDTH + 90, bottom + (logarithmic ? 22 : 4), body);
}

}  // namespace report
