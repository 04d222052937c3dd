// A program outside the project, built with the installed libraries. It initializes logging, logs a
// line and uses a network of one rule.

#include <cstdio>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "services/pipeline/indexprocessor/Rete.h"
#include "util/LoaderInfo.h"
#include "util/Logger.h"
#include "util/Version.h"

#ifdef EXPECTED_VERSION
static_assert(std::string_view(QUELTA_VERSION) == EXPECTED_VERSION);
#endif

int main(int argc, char** argv, char** envp) {
    LoaderInfo::common_main_setup(argc, argv, envp);
    LoaderInfo& info = *LoaderInfo::getInstance();
    info.populateFromCommandLine();
    xml::node node("settings");
    info.setCommonComponentNode(node);
    std::printf("%s %s\n", info.getComponentName().c_str(),
                info.getCommonComponentNode().get_name());

    Logger("Consumer").info("logged by %s", info.getComponentName().c_str());

    RuleSystem rules;
    std::string implication = "it fired";
    rules.addCondition("a*z", *new AndOperator(nullptr, implication));
    std::vector<std::pair<WildcardMatcher, Conditional*>*> candidates;
    StringSet implications;
    rules.resetAll(implications);
    rules.setCondition("abcxyz", candidates, implications);
    for (const std::string& implied : implications) {
        std::puts(implied.c_str());
    }
    return 0;
}
