#ifndef QUELTA_EXAMPLES_RULES_H_
#define QUELTA_EXAMPLES_RULES_H_

// Reads a file of rules for a network, one to a line:
//
//     implication: condition, condition
//
// `*` in a condition matches any characters. Blanks at both ends of implications and conditions,
// empty lines, and lines that start with `#` are ignored.
//
//     RuleSystem rules;
//     readRules(Pathname("rules.txt"), [&rules](Rule& rule) {
//         addRule(rules, std::make_unique<AndOperator>(nullptr, rule.implication), rule);
//     });
//
// Not thread-safe; one thread at a time per object.

#include <functional>
#include <memory>
#include <string>

#include "services/pipeline/indexprocessor/Rete.h"
#include "util/Pathname.h"

struct Rule {
    std::string implication;
    StringSet conditions;  // at least one
};

// Passes each rule of a file to `take`.
// Errors: std::runtime_error, with the file and the line, for a line that is not a rule and for
// what `take` throws.
void readRules(const Pathname& path, const std::function<void(Rule&)>& take);

// Registers `op`, which `rules` then owns, on all conditions of the rule.
// Errors: std::length_error, as by RuleSystem::addCondition; `rules` owns the operator even then.
void addRule(RuleSystem& rules, std::unique_ptr<BoolOperator> op, const Rule& rule);

#endif  // QUELTA_EXAMPLES_RULES_H_
