#include "Rules.h"

#include <exception>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "util/DCUtils.h"

namespace {

Rule parsed(const std::string& line) {
    const std::size_t colon = line.find(':');
    Rule rule = {strip(line.substr(0, colon)), {}};
    if (colon != std::string::npos) {
        std::istringstream conditions(line.substr(colon + 1));
        for (std::string condition; std::getline(conditions, condition, ',');) {
            condition = strip(condition);
            if (condition.empty()) {
                throw std::runtime_error("a condition is empty");
            }
            rule.conditions.insert(condition);
        }
    }
    if (rule.implication.empty() || rule.conditions.empty()) {
        throw std::runtime_error("expected \"implication: condition, ...\"");
    }
    return rule;
}

}  // namespace

void readRules(const Pathname& path, const std::function<void(Rule&)>& take) {
    std::ifstream file(path);
    if (!file) {
        throw std::runtime_error(path + ": cannot be read");
    }
    unsigned number = 0;
    for (std::string line; std::getline(file, line);) {
        ++number;
        line = strip(line);
        if (line.empty() || line[0] == '#') {
            continue;
        }
        try {
            Rule rule = parsed(line);
            take(rule);
        } catch (const std::exception& e) {
            throw std::runtime_error(path + ':' + std::to_string(number) + ": " + e.what());
        }
    }
    if (file.bad()) {
        throw std::runtime_error(path + ": cannot be read");
    }
}

void addRule(RuleSystem& rules, std::unique_ptr<BoolOperator> op, const Rule& rule) {
    BoolOperator& added = *op;
    rules.addOperator(added);
    op.release();  // rules owns it now, even if a condition is refused
    for (const std::string& condition : rule.conditions) {
        rules.addCondition(condition, added);
    }
}
