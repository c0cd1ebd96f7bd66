// Runs a body that must raise and gives back the TEException it raised, for tests that check the
// exception's fields; a body that raises nothing fails the test.
#pragma once

#include <gtest/gtest.h>

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

}  // namespace sm::testing
