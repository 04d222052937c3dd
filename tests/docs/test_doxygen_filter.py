#!/usr/bin/env python3
"""Tests what doxygen_filter.py makes of each kind of comment.

Usage: test_doxygen_filter.py DOXYGEN_FILTER
"""
import pathlib
import subprocess
import sys
import tempfile
import unittest

FILTER = sys.argv.pop()
HEADER = r'''#ifndef GUARD_H_
// A "unit" of 100 %, a*b --c.
//
//     Queue queue(1);
//
// Safe from any thread.

// Twice.
#define TWICE(x) \
    ((x) + (x))
// A queue.
class Queue {
public:
    // Creates a queue.
    // Requires: `max` > 0.
    explicit Queue(int max) : _max{max} {
        grow();  // not a description
    }
    Queue(const Queue&) = delete;
    // Returns: the size.
    // Errors: none.
    int size() const;
    int size(int limit,
             int other) const;
    int other() const;

    int count = 0;  // of items
};
// --- Free functions ----------
// Prints.
void print();
#endif  // GUARD_H_
'''
FILTERED = r'''#ifndef GUARD_H_
/// \file
/// A \"unit\" of 100 \%, a*b \--c.
///
/// \code{.cpp}
/// Queue queue(1);
/// \endcode
///
/// Safe from any thread.

/// Twice.
#define TWICE(x) \
    ((x) + (x))
/// A queue.
class Queue {
public:
/// Creates a queue.
///
/// \pre
/// `max` \> 0.
    explicit Queue(int max) : _max{max} {
        grow();  // not a description
    }
/// Deleted.
    Queue(const Queue&) = delete;
/// Returns the size.
///
/// \par Errors
/// none.
    int size() const;
/// Returns the size.
///
/// \par Errors
/// none.
    int size(int limit,
             int other) const;
    int other() const;

    int count = 0;  ///< of items
};
/// @name Free functions
/// @{
/// Prints.
void print();
/// @}
#endif  // GUARD_H_
'''


class DoxygenFilter(unittest.TestCase):
    maxDiff = None

    def test_turns_comments_into_descriptions(self):
        with tempfile.TemporaryDirectory() as directory:
            header = pathlib.Path(directory, 'Queue.h')
            header.write_text(HEADER)
            filtered = subprocess.run([FILTER, header], capture_output=True, text=True, check=True)
        self.assertEqual(FILTERED, filtered.stdout)


unittest.main()
