// Usage: rule_console RULES
// Reads rules from a file, then terms from standard input, one to a line. Prints what each term
// changes: "+ implication" when a rule fires, "- implication" when it stops firing.
//
//     implication: condition, condition    a rule; `*` in a condition matches any characters
//     term                                 sets the conditions that match the term
//     -term                                resets them
//     !                                    resets all conditions
//
// Empty lines, and lines of the file that start with `#`, are ignored. The term `meta::all` is set
// at the start and after each `!`.

#include <algorithm>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>

#include "services/pipeline/indexprocessor/Rete.h"

namespace {

std::string trimmed(const std::string& text) {
    const std::size_t first = text.find_first_not_of(" \t\r");
    if (first == std::string::npos) {
        return "";
    }
    return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

// A rule is an operator that all conditions feed and that implies one text.
void addRule(RuleSystem& rules, const std::string& line) {
    const std::size_t colon = line.find(':');
    std::string implication = trimmed(line.substr(0, colon));
    if (colon == std::string::npos || implication.empty()) {
        throw std::runtime_error("expected \"implication: condition, ...\"");
    }
    auto owner = std::make_unique<AndOperator>(nullptr, implication);
    AndOperator& op = *owner;
    rules.addOperator(op);
    owner.release();  // rules owns it now, even if a condition is refused

    std::istringstream conditions(line.substr(colon + 1));
    for (std::string condition; std::getline(conditions, condition, ',');) {
        condition = trimmed(condition);
        if (condition.empty()) {
            throw std::runtime_error("a condition is empty");
        }
        rules.addCondition(condition, op);
    }
}

void readRules(RuleSystem& rules, const char* path) {
    std::ifstream file(path);
    if (!file) {
        throw std::runtime_error(std::string(path) + ": cannot be read");
    }
    unsigned number = 0;
    for (std::string line; std::getline(file, line);) {
        ++number;
        line = trimmed(line);
        if (line.empty() || line[0] == '#') {
            continue;
        }
        try {
            addRule(rules, line);
        } catch (const std::exception& e) {
            throw std::runtime_error(std::string(path) + ':' + std::to_string(number) + ": " +
                                     e.what());
        }
    }
}

void printChanges(const StringSet& before, const StringSet& after) {
    StringSet changed;
    std::set_difference(before.begin(), before.end(), after.begin(), after.end(),
                        std::inserter(changed, changed.end()));
    for (const std::string& stopped : changed) {
        std::cout << "- " << stopped << '\n';
    }
    changed.clear();
    std::set_difference(after.begin(), after.end(), before.begin(), before.end(),
                        std::inserter(changed, changed.end()));
    for (const std::string& fired : changed) {
        std::cout << "+ " << fired << '\n';
    }
    std::cout.flush();
}

void handle(RuleSystem& rules, const std::string& line, StringSet& implications) {
    RuleSystem::Candidates candidates;
    if (line == "!") {
        rules.resetAll(implications);
    } else if (line[0] == '-') {
        rules.resetCondition(trimmed(line.substr(1)), candidates, implications);
    } else {
        rules.setCondition(line, candidates, implications);
    }
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::cerr << "Usage: rule_console RULES < TERMS\n";
        return 2;
    }
    try {
        RuleSystem rules;
        readRules(rules, argv[1]);

        StringSet implications;
        rules.resetAll(implications);
        printChanges({}, implications);
        for (std::string line; std::getline(std::cin, line);) {
            line = trimmed(line);
            if (!line.empty()) {
                const StringSet before = implications;
                handle(rules, line, implications);
                printChanges(before, implications);
            }
        }
    } catch (const std::exception& e) {
        std::cerr << "rule_console: " << e.what() << '\n';
        return 1;
    }
    return 0;
}
