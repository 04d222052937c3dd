// This system: the whole rule network, its prefix trie alone, and one compiled matcher.

#include <benchmark/benchmark.h>

#include "PatternPeer.h"
#include "services/pipeline/indexprocessor/Rete.h"
#include "util/TrieNode.h"
#include "util/WildcardMatcher.h"

namespace {

using Pair = std::pair<WildcardMatcher, Conditional*>;

// Each pattern is a condition that feeds an operator of its own, as in the program.
class NetworkSet : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        for (const std::string& pattern : patterns) {
            std::string implication = pattern + '\n';
            _rules.addCondition(pattern, *new AndOperator(nullptr, implication));
        }
        return "";
    }

    long count(const std::string& term) override {
        _rules.setCondition(term, _candidates, _implications);
        return static_cast<long>(_implications.size());
    }

    bool keepsMatches() const override { return true; }
    void forget(const std::string& term) override {
        _rules.resetCondition(term, _candidates, _implications);
    }

    long collect(const std::string& term) override {
        _rules.resetAll(_implications);
        return count(term);
    }

private:
    RuleSystem _rules;
    std::vector<Pair*> _candidates;
    StringSet _implications;
};

// The two steps of a lookup without the network: candidates by prefix, then the match.
class TrieSet : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        for (const std::string& pattern : patterns) {
            const WildcardMatcher matcher(pattern.c_str());
            _trie.addData(matcher.getPatternPrefix(), Pair(matcher, nullptr));
        }
        return "";
    }

    long count(const std::string& term) override {
        _trie.findData(term, _candidates);
        long matches = 0;
        for (const Pair* candidate : _candidates) {
            matches += candidate->first.isMatch(term.c_str()) ? 1 : 0;
        }
        return matches;
    }

private:
    TrieNode<Pair> _trie;
    std::vector<Pair*> _candidates;
};

class MatcherSingle : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        _matcher = std::make_unique<WildcardMatcher>(pattern.c_str());
        return true;
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.c_str();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            matches += _matcher->isMatch(start) ? 1 : 0;
        }
        return matches;
    }

private:
    std::unique_ptr<WildcardMatcher> _matcher;
};

using bench::Meaning;
const bench::Registrar<bench::PatternSetPeer, NetworkSet> network("RuleSystem",
                                                                  Meaning::SUFFIX_SEARCH);
const bench::Registrar<bench::PatternSetPeer, TrieSet> trie("trie and matcher",
                                                            Meaning::SUFFIX_SEARCH);
const bench::Registrar<bench::SinglePeer, MatcherSingle> matcher("WildcardMatcher",
                                                                 Meaning::SUFFIX_SEARCH);

}  // namespace
