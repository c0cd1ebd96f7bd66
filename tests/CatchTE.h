// Runs a body that must raise and gives back the TEException it raised, for tests that check the
// exception's fields; a body that raises nothing fails the test. ExpectTE checks the usual fields.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "framework/TEException.h"

namespace sm::testing {

template <class Body>
TEException CatchTE(Body body) {
    try {
        body();
    } catch (const TEException& caught) {
        return caught;
    }
    ADD_FAILURE() << "nothing was raised";
    return {};
}

// The raised code and description, and the raising function when one is given.
template <class Body>
void ExpectTE(Body body, int code, const std::string& description, const char* function = nullptr) {
    TEException caught = CatchTE(body);
    EXPECT_EQ(caught.GetErrorCode(), code);
    EXPECT_EQ(caught.GetDescription(), description);
    if (function) {
        EXPECT_STREQ(caught.GetFunction(), function);
    }
}

}  // namespace sm::testing
