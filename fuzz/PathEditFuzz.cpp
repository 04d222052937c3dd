// Path editing against the slow versions. The first line is the path, the rest an element to join.

#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "support/PathOracles.h"
#include "util/Pathname.h"

namespace {

using fuzz::checkEqual;

template <typename Edit>
Pathname edited(const std::string& path, Edit edit) {
    Pathname result(path);
    (result.*edit)();
    return result;
}

void checkEdits(const std::string& path) {
    using Edit = void (Pathname::*)();
    std::string withSep = path;
    if (path.empty() || path.back() != '/') {
        withSep += '/';
    }
    checkEqual("addTrailingSep", withSep, edited(path, &Pathname::addTrailingSep));
    checkEqual("removeTrailingSeps", path_oracle::withoutTrailingSeps(path),
               edited(path, &Pathname::removeTrailingSeps));
    checkEqual("stripElement", path_oracle::stripElement(path),
               edited(path, &Pathname::stripElement));
    checkEqual("toParent", path_oracle::stripElement(path), Pathname(path).toParent());
    checkEqual("removeDotDotSlash", path_oracle::removeDotDotSlash(path),
               edited(path, &Pathname::removeDotDotSlash));
    checkEqual("removeDoubleSeps", path_oracle::removeDoubleSeps(path),
               edited(path, Edit(&Pathname::removeDoubleSeps)));
    checkEqual("removeDoubleSeps of a copy", path_oracle::removeDoubleSeps(path),
               Pathname::removeDoubleSeps(Pathname(path)));
}

void checkParts(const std::string& path) {
    const Pathname pathname(path);
    checkEqual("toLeaf", path_oracle::toLeaf(path), pathname.toLeaf());
    checkEqual("ext", path_oracle::ext(path), pathname.ext());
    checkEqual("basenameWithoutExt", path_oracle::basenameWithoutExt(path),
               pathname.basenameWithoutExt());
    checkEqual("isAbsolute", path.substr(0, 1) == "/", pathname.isAbsolute());
    checkEqual("containsSep", path_oracle::pieces(path).size() > 1, pathname.containsSep());
}

// The pieces of a list, split by the oracle that splits paths.
void checkList(const std::string& list) {
    std::vector<std::string> expected;
    for (const std::string& piece : path_oracle::pieces(fuzz::FuzzInput::text(list))) {
        if (!piece.empty()) {
            expected.push_back(piece);
        }
    }
    const PathList paths(list, '/');
    checkEqual("PathList", expected, std::vector<std::string>(paths.begin(), paths.end()));
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const std::string path = input.line();
    const std::string elem = input.rest();

    checkEdits(path);
    checkParts(path);
    checkList(path);
    const std::string joined = path_oracle::join(path, elem);
    checkEqual("operator/", joined, Pathname(path) / elem);
    Pathname inPlace(path);
    inPlace /= elem;
    checkEqual("operator/=", joined, inPlace);
    checkEqual("operator/ with a character string",
               path_oracle::join(path, fuzz::FuzzInput::text(elem)), Pathname(path) / elem.c_str());
    Pathname twice(path);
    twice /= static_cast<const Pathname&>(twice);
    checkEqual("operator/= with the path itself", path_oracle::join(path, path), twice);
    return 0;
}
