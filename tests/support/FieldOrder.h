#ifndef QUELTA_TESTS_SUPPORT_FIELDORDER_H_
#define QUELTA_TESTS_SUPPORT_FIELDORDER_H_

#include <algorithm>
#include <functional>
#include <initializer_list>

// Whether these fields of one object are at ascending addresses, in the order given.
inline bool standInOrder(std::initializer_list<const void*> fields) {
    return std::adjacent_find(fields.begin(), fields.end(), std::greater_equal<const void*>()) ==
           fields.end();
}

#endif  // QUELTA_TESTS_SUPPORT_FIELDORDER_H_
