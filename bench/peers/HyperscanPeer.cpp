// Hyperscan (or Vectorscan, the same interface): all patterns in one database in block mode. Each
// pattern reports its first match only.

#include <benchmark/benchmark.h>
#include <hs/hs.h>

#include "PatternPeer.h"

namespace {

// The database and its scratch space.
class Database {
public:
    Database() = default;
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;
    ~Database() {
        hs_free_scratch(_scratch);
        hs_free_database(_database);
    }

    std::string compile(const std::vector<std::string>& patterns) {
        std::vector<std::string> regexes;
        for (const std::string& pattern : patterns) {
            regexes.push_back('^' + bench::toRegex(pattern, ".*") + "\\z");
        }
        std::vector<const char*> pointers;
        std::vector<unsigned> ids;
        for (const std::string& regex : regexes) {
            pointers.push_back(regex.c_str());
            ids.push_back(static_cast<unsigned>(ids.size()));
        }
        const std::vector<unsigned> flags(regexes.size(), HS_FLAG_DOTALL | HS_FLAG_SINGLEMATCH);
        hs_compile_error_t* error = nullptr;
        if (hs_compile_multi(pointers.data(), flags.data(), ids.data(),
                             static_cast<unsigned>(pointers.size()), HS_MODE_BLOCK, nullptr,
                             &_database, &error) != HS_SUCCESS) {
            std::string reason = error->message;
            hs_free_compile_error(error);
            return reason;
        }
        return hs_alloc_scratch(_database, &_scratch) == HS_SUCCESS ? "" : "no scratch space";
    }

    long scan(const char* text, std::size_t length) {
        long matches = 0;
        const auto count = [](unsigned, unsigned long long, unsigned long long, unsigned,
                              void* context) {
            ++*static_cast<long*>(context);
            return 0;
        };
        const hs_error_t status =
            hs_scan(_database, text, static_cast<unsigned>(length), 0, _scratch, count, &matches);
        return status == HS_SUCCESS ? matches : -1;
    }

private:
    hs_database_t* _database = nullptr;
    hs_scratch_t* _scratch = nullptr;
};

class HyperscanSet : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        return _database.compile(patterns);
    }

    long count(const std::string& term) override {
        return _database.scan(term.data(), term.size());
    }

private:
    Database _database;
};

class HyperscanSingle : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        return _database.compile({pattern}).empty();
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.data();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            matches += _database.scan(start, text.size()) > 0 ? 1 : 0;
        }
        return matches;
    }

private:
    Database _database;
};

const bench::Registrar<bench::PatternSetPeer, HyperscanSet> setPeer("Hyperscan",
                                                                    bench::Meaning::USUAL);
const bench::Registrar<bench::SinglePeer, HyperscanSingle> singlePeer("Hyperscan",
                                                                      bench::Meaning::USUAL);

}  // namespace
