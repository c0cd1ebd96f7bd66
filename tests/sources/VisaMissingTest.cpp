// No VISA library (ctest disables visa32.dll for this process): built-in status texts, listing error.
#include <gtest/gtest.h>

#include "com/ComClient.h"
#include "sources/VisaLibrary.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);
}

// Catches an empty or garbled description where no library could give one, and a listing that hides
// the missing library or reports it without a readable text.
TEST(VisaMissing, StatusesAreDescribedFromTheBuiltInTable) {
    char text[visa::DescriptionSize] = {};
    EXPECT_EQ(visa::StatusDesc(0, visa::ResourceNotFound, text), visa::UnknownStatus);
    EXPECT_STREQ(text, "Unknown status value 0xBFFF0011");
    auto manager = CreateManager();
    auto category = Bstr(L"VISA"), filter = Bstr(L"");
    UniqueSafeArray names;
    EXPECT_EQ(manager->GetNames(category.Get(), static_cast<GetNamesOptions>(3), filter.Get(), names.Put()),
              static_cast<HRESULT>(visa::LibraryNotFound));
    EXPECT_EQ(TakeErrorInfo().description,
              "viOpenDefaultRM returned -1073807202. Description: 'A code library required by VISA could not be "
              "located or loaded.'.");
}
