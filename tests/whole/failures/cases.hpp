// What a call has to do when an allocation fails, as a list of cases: each room has its own.
#pragma once

#include <functional>
#include <ostream>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/abs/memory.h"
#include "kzsdk/xml/xml.h"

namespace kz::test::failures {

/// Calls the function and takes back what it did. True when it succeeded.
using Attempt = std::function<bool()>;

enum Promise {
    Reports,  ///< fails whenever an allocation fails
    Conceals, ///< documented to succeed now and then all the same: docs/deliberate_behaviour.md
};

struct Case {
    const char* function;
    Promise promise;
    std::function<Attempt()> prepare; ///< makes what the attempts work on
};

inline void PrintTo(const Case& tested, std::ostream* out) { *out << tested.function; }

std::vector<Case> abs_cases();
std::vector<Case> xml_cases();
std::vector<Case> dsp_cases();
std::vector<Case> qv_cases();
std::vector<Case> fpx_cases();
std::vector<Case> stream_cases();
std::vector<Case> disc_cases();

inline bool given_back(void* block) { return block != nullptr && _kzmem_free(block) == KZ_OK; }

inline bool disposed_of(XMLTag* tag)
{
    DisposeXMLTag(tag);
    return tag != nullptr;
}

} // namespace kz::test::failures
