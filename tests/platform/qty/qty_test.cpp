#include "platform/qty/qty.hpp"

#include <gtest/gtest.h>

namespace {

TEST(Quantities, TypesUnitsAndTheirTexts) {
    std::string text;
    EXPECT_TRUE(qtyGetItemTypeKey(100078, text));
    EXPECT_EQ(text, "Surface Elevation");
    EXPECT_TRUE(qtyGetItemTypeKey(999, text));
    EXPECT_EQ(text, "Undefined");
    EXPECT_FALSE(qtyGetItemTypeKey(123, text));
    EXPECT_EQ(text, "Unknown");
    EXPECT_TRUE(qtyGetUnitKey(1400, text));
    EXPECT_EQ(text, "sec");
    EXPECT_FALSE(qtyGetUnitKey(7, text));

    // Every type the engine writes has a base unit that the unit table knows.
    for (int type : {100000, 100016, 100078, 100079, 100080, 100097, 100106, 100107, 100280, 100294,
                     100296, 100297, 100299}) {
        int unit = -1;
        ASSERT_TRUE(qtyGetItemUserUnit(type, unit)) << type;
        int first = -2;
        ASSERT_TRUE(qtyGetItemUnitSeq(type, 1, first, text)) << type;
        EXPECT_EQ(first, unit) << type;
        EXPECT_TRUE(qtyItemUnitEqv(type, unit));
        EXPECT_FALSE(qtyGetCfUnit(unit).empty()) << unit;
    }
    int unit = 0;
    EXPECT_FALSE(qtyGetItemUserUnit(999, unit));
    EXPECT_TRUE(qtyGetItemUnitSeq(100080, 2, unit, text));
    EXPECT_EQ(unit, 4701);
    EXPECT_FALSE(qtyGetItemUnitSeq(100080, 3, unit, text));
    EXPECT_FALSE(qtyItemUnitEqv(100078, 1400));  // a time is no elevation
    EXPECT_TRUE(qtyItemUnitEqv(999, 1400));
}

TEST(Quantities, ConversionWithinOneDimensionOnly) {
    double v = 10.0;
    EXPECT_TRUE(qtyConvertUnit(1003, 1000, v));
    EXPECT_DOUBLE_EQ(v, 3.048);
    EXPECT_TRUE(qtyConvertUnit(1000, 1003, v));
    EXPECT_DOUBLE_EQ(v, 10.0);
    v = 2.0;
    EXPECT_TRUE(qtyConvertUnit(1402, 1400, v));
    EXPECT_DOUBLE_EQ(v, 7200.0);
    EXPECT_TRUE(qtyConvertUnit(2002, 2000, v = 1.0));
    EXPECT_NEAR(v, 0.514444, 1e-6);
    v = 5.0;
    EXPECT_FALSE(qtyConvertUnit(1000, 1400, v));
    EXPECT_EQ(v, 5.0);
    EXPECT_FALSE(qtyConvertUnit(1000, 12345, v));
}

TEST(Quantities, CfUnitTextsReadBack) {
    for (int unit : {1000, 1003, 1400, 1402, 2000, 4700, 99000})
        EXPECT_EQ(qtyUnitFromCf(qtyGetCfUnit(unit)), unit) << unit;
    EXPECT_EQ(qtyUnitFromCf("metres"), 1000);
    EXPECT_EQ(qtyUnitFromCf("m  s-1"), 2000);
    EXPECT_EQ(qtyUnitFromCf("furlongs"), -1);
}

}  // namespace
