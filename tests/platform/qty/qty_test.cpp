// Item types and units: the texts of the tables, the unit sequence of each
// type the engine writes, conversion within one dimension, CF unit texts.
#include "platform/qty/qty.hpp"

#include <gtest/gtest.h>

namespace {

TEST(Quantities, TypesUnitsAndTheirTexts) {
    std::string text;
    EXPECT_TRUE(qtyGetItemTypeKey(100078, text) && text == "Surface Elevation");
    EXPECT_TRUE(qtyGetItemTypeKey(999, text) && text == "Undefined");
    EXPECT_TRUE(!qtyGetItemTypeKey(123, text) && text == "Unknown");
    EXPECT_TRUE(qtyGetUnitKey(1400, text) && text == "sec" && !qtyGetUnitKey(7, text));
    // Every type the engine writes has a base unit, first in its sequence,
    // with a CF text for the data files.
    for (int type : {100000, 100016, 100078, 100079, 100080, 100097, 100106, 100107, 100280, 100294,
                     100296, 100297, 100299}) {
        int unit = -1, first = -2;
        ASSERT_TRUE(qtyGetItemUserUnit(type, unit)) << type;
        ASSERT_TRUE(qtyGetItemUnitSeq(type, 1, first, text)) << type;
        EXPECT_EQ(first, unit) << type;
        EXPECT_TRUE(qtyItemUnitEqv(type, unit)) << type;
        EXPECT_FALSE(qtyGetCfUnit(unit).empty()) << unit;
    }
    int unit = 0;
    EXPECT_FALSE(qtyGetItemUserUnit(999, unit));
    EXPECT_TRUE(qtyGetItemUnitSeq(100080, 2, unit, text) && unit == 4701);
    EXPECT_FALSE(qtyGetItemUnitSeq(100080, 3, unit, text));
    EXPECT_FALSE(qtyItemUnitEqv(100078, 1400));  // a time is no elevation
    EXPECT_TRUE(qtyItemUnitEqv(999, 1400));      // any unit fits an undefined type
}

// Feet, hours and knots by their definitions; across dimensions or to an
// unknown unit nothing changes. CF texts read back, UDUNITS spellings too.
TEST(Quantities, ConversionWithinOneDimensionAndCfTexts) {
    const struct {
        int from, to;
        double in, out;
    } cases[] = {
        {1003, 1000, 10.0, 3.048},
        {1402, 1400, 2.0, 7200.0},
        {2002, 2000, 3600.0, 1852.0},
        {1051, 1050, 0.3048, 1.0}};  // a curvature of 0.3048 per foot is 1 per metre
    for (const auto& c : cases) {
        double v = c.in;
        EXPECT_TRUE(qtyConvertUnit(c.from, c.to, v)) << c.from;
        EXPECT_NEAR(v, c.out, 1e-12 * c.out) << c.from << " to " << c.to;
    }
    double v = 5.0;
    EXPECT_FALSE(qtyConvertUnit(1000, 1400, v));
    EXPECT_FALSE(qtyConvertUnit(1000, 12345, v));
    EXPECT_EQ(v, 5.0);
    for (int unit : {1000, 1003, 1050, 1400, 1402, 2000, 4700, 99000})
        EXPECT_EQ(qtyUnitFromCf(qtyGetCfUnit(unit)), unit) << unit;
    EXPECT_EQ(qtyUnitFromCf("metres"), 1000);
    EXPECT_EQ(qtyUnitFromCf("m  s-1"), 2000);
    EXPECT_EQ(qtyUnitFromCf("furlongs"), -1);
}

}  // namespace
