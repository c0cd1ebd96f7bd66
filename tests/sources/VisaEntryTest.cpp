// The VISA name groups: which resource a VISA logical name joins, and their state text.
#include <gtest/gtest.h>

#include "sources/VisaEntry.h"

using namespace sm;

namespace {
VisaEntryList Bench() {
    StringVector resources{DynamicString("GPIB0::14::INSTR"), DynamicString("ASRL1::INSTR")};
    VisaLogicalNames logicalNames{{DynamicString("DMM"), DynamicString("gpib0::14::instr")},
                                  {DynamicString("Gone"), DynamicString("GPIB0::9::INSTR")},
                                  {DynamicString("Meter"), DynamicString("GPIB0::14::INSTR")}};
    return BuildVisaEntries(resources, logicalNames);
}
}  // namespace

// Catches a case-sensitive join, a lost file order, an entry made for a logical name of no scanned
// resource, and a wrong count, index or flag word in the manager's state description.
TEST(VisaEntries, LogicalNamesJoinTheirResourceAndTheStateTextDescribesEveryGroup) {
    DynamicString text;
    AppendVisaStateDescription(Bench(), text);
    EXPECT_EQ(std::string(text.View()),
              "VISA Configuration:\n   Number of resources = 2\n"
              "      Resource # = 0\n         ViName 'GPIB0::14::INSTR'\n"
              "         name list (3):GPIB0::14::INSTR (VirtualInstrumentName), DMM (LogicalName), Meter (LogicalName)\n"
              "         resource 'GPIB0::14::INSTR'\n\n"
              "      Resource # = 1\n         ViName 'ASRL1::INSTR'\n"
              "         name list (1):ASRL1::INSTR (VirtualInstrumentName)\n"
              "         resource 'ASRL1::INSTR'\n\n\n");
}
