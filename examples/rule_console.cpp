// Usage: rule_console RULES
//        rule_console --graph RULES
// Reads rules from a file (Rules.h describes it), then terms from standard input, one to a line.
// Prints what each term changes: "+ implication" when a rule fires, "- implication" when it stops
// firing.
//
//     term     sets the conditions that match the term
//     -term    resets them
//     !        resets all conditions
//
// Empty lines are ignored. The term `meta::all` is set at the start and after each `!`.
// With --graph it prints the rules as a graph in the language of Graphviz, and reads no terms.

#include <algorithm>
#include <exception>
#include <iomanip>
#include <iostream>
#include <iterator>
#include <memory>
#include <string>

#include "Rules.h"
#include "services/pipeline/indexprocessor/Rete.h"
#include "util/DCUtils.h"
#include "util/Pathname.h"

namespace {

constexpr const char* USAGE =
    "Usage: rule_console RULES < TERMS\n       rule_console --graph RULES\n";

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
        rules.resetCondition(strip(line.substr(1)), candidates, implications);
    } else {
        rules.setCondition(line, candidates, implications);
    }
}

void printGraph(const Pathname& path) {
    std::cout << "digraph rules {\n    rankdir=LR;\n    node [fontname=\"sans-serif\"];\n";
    int number = 0;
    readRules(path, [&number](const Rule& rule) {
        // A condition contains no comma, so it cannot have the name of this node.
        const std::string node = "\"rule," + std::to_string(++number) + '"';
        std::cout << "    " << node << " [shape=box, label=" << std::quoted(rule.implication)
                  << "];\n";
        for (const std::string& condition : rule.conditions) {
            std::cout << "    " << std::quoted(condition) << " -> " << node << ";\n";
        }
    });
    std::cout << "}\n";
}

void answerTerms(const Pathname& path) {
    RuleSystem rules;
    readRules(path, [&rules](Rule& rule) {
        addRule(rules, std::make_unique<AndOperator>(nullptr, rule.implication), rule);
    });

    StringSet implications;
    rules.resetAll(implications);
    printChanges({}, implications);
    for (std::string line; std::getline(std::cin, line);) {
        line = strip(line);
        if (!line.empty()) {
            const StringSet before = implications;
            handle(rules, line, implications);
            printChanges(before, implications);
        }
    }
}

}  // namespace

int main(int argc, char** argv) {
    const bool isGraph = argc == 3 && std::string(argv[1]) == "--graph";
    if (argc != 2 && !isGraph) {
        std::cerr << USAGE;
        return 2;
    }
    if (argv[1] == std::string("--help")) {
        std::cout << USAGE;
        return 0;
    }
    try {
        if (isGraph) {
            printGraph(Pathname(argv[2]));
        } else {
            answerTerms(Pathname(argv[1]));
        }
    } catch (const std::exception& e) {
        std::cerr << "rule_console: " << e.what() << '\n';
        return 1;
    }
    return 0;
}
