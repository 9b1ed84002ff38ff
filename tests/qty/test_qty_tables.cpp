// Integrity of the unit and quantity tables, and the keys other parts of the
// system rely on.
#include <gtest/gtest.h>

#include <cctype>
#include <cmath>
#include <limits>
#include <set>
#include <string>

#include "qty/qty.h"
#include "qty/qty_internal.h"
#include "qty/qty_tables.h"

using namespace qty;

namespace {

std::string lower(std::string s) {
    for (char& c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return s;
}

bool printableAscii(const char* s) {
    if (s == nullptr || *s == '\0') return false;
    for (; *s != '\0'; ++s)
        if (*s <= ' ' || *s > '~') return false;
    return true;
}

}  // namespace

TEST(QtyTables, UnitRecordsAreWellFormedAndTextsUnique) {
    std::set<std::string> texts;
    for (const Unit& u : kUnits) {
        SCOPED_TRACE(u.text);
        EXPECT_TRUE(printableAscii(u.text));
        EXPECT_NE(std::string(u.description), "");
        EXPECT_TRUE(texts.insert(u.text).second) << "duplicate unit text";
        EXPECT_GT(u.scale.n, 0);
        EXPECT_EQ(ratReduced(u.scale.n, u.scale.d), u.scale);
        // Offsets belong to temperature scales only.
        if (u.offset.n != 0) {
            EXPECT_EQ(u.dim, dim::kTemperature);
            EXPECT_EQ(u.piPower, 0);
        }
    }
    for (const Alias& a : kUnitAliases) {
        SCOPED_TRACE(a.text);
        EXPECT_TRUE(texts.insert(a.text).second) << "alias repeats a unit text or another alias";
        EXPECT_NE(findUnit(a.unit), nullptr);
    }
}

TEST(QtyTables, QuantitySequencesMatchTheirDimension) {
    std::set<std::string> folded;
    std::set<int32_t> usedUnits;
    for (const Quantity& q : kQuantities) {
        SCOPED_TRACE(q.text);
        EXPECT_TRUE(printableAscii(q.text));
        EXPECT_NE(std::string(q.description), "");
        EXPECT_TRUE(folded.insert(lower(q.text)).second) << "quantity text not unique ignoring case";
        ASSERT_FALSE(q.units.empty());
        std::set<int32_t> seen;
        for (int32_t key : q.units) {
            const Unit* u = findUnit(key);
            ASSERT_NE(u, nullptr) << key;
            EXPECT_EQ(u->dim, q.dim) << u->text;
            EXPECT_TRUE(seen.insert(key).second) << "unit listed twice: " << u->text;
            usedUnits.insert(key);
        }
    }
    // Every unit is offered by some quantity (catches a unit left out of the sequences).
    for (const Unit& u : kUnits) EXPECT_TRUE(usedUnits.count(u.key)) << u.text;
}

TEST(QtyTables, EveryPairOfOneDimensionHasAnExactRoundTrippingMap) {
    int pairs = 0;
    for (const Unit& from : kUnits) {
        for (const Unit& to : kUnits) {
            Affine there;
            Affine back;
            bool exact = false;
            if (!(from.dim == to.dim)) {
                EXPECT_FALSE(affineBetween(from, to, there)) << from.text << " -> " << to.text;
                continue;
            }
            ASSERT_TRUE(affineBetween(from, to, there, &exact));
            ASSERT_TRUE(affineBetween(to, from, back));
            ++pairs;
            EXPECT_TRUE(exact) << from.text << " -> " << to.text;
            for (double v : {1.0, -3.75, 1234.5678, 1e-7}) {
                const double w = applyAffine(applyAffine(v, there), back);
                const double tol = 8 * std::numeric_limits<double>::epsilon() *
                                   (std::fabs(v) + std::fabs(there.offset * back.scale) + std::fabs(back.offset));
                EXPECT_NEAR(w, v, tol) << from.text << " -> " << to.text;
            }
        }
    }
    EXPECT_GT(pairs, 500);
}

TEST(QtyTables, FixedKeysExistWithTheirDimensions) {
    const Quantity* undefined = findQuantity(QTY_ITEM_UNDEFINED);
    ASSERT_NE(undefined, nullptr);
    EXPECT_EQ(undefined->units.front(), QTY_UNIT_UNDEFINED);
    for (int32_t g = QTY_ITEM_GEOMETRY_0D; g <= QTY_ITEM_GEOMETRY_3D; ++g) {
        ASSERT_NE(findQuantity(g), nullptr) << g;
        EXPECT_EQ(findQuantity(g)->dim, dim::kLength);
        EXPECT_EQ(findQuantity(g)->units.front(), kMetre);
    }
    ASSERT_NE(findUnit(QTY_UNIT_SECOND), nullptr);
    EXPECT_STREQ(findUnit(QTY_UNIT_SECOND)->text, "s");
    EXPECT_EQ(findUnit(QTY_UNIT_SECOND)->scale, rat(1));

    const struct {
        int32_t key;
        Dim dim;
    } vre[] = {
        {100514, dim::kLength},   {110030, dim::kArea},           {110243, dim::kNone},
        {110244, dim::kAcceleration}, {100280, dim::kLength},     {110245, dim::kMass},
        {110246, dim::kForcePerLength}, {100085, dim::kAngularVelocity}, {110247, dim::kWaveNumber},
        {100515, dim::kInertia},  {110248, dim::kPressure},       {110266, dim::kMass},
        {110250, dim::kMassRate}, {110258, dim::kLength},         {110220, dim::kAngle},
        {100415, dim::kAngle},    {100144, dim::kForcePerLength},
    };
    for (const auto& v : vre) {
        const Quantity* q = findQuantity(v.key);
        ASSERT_NE(q, nullptr) << v.key;
        EXPECT_EQ(q->dim, v.dim) << v.key;
    }
    // The gravity scalar's default 9.80665 is one standard gravity in the base unit.
    double out = 0;
    ASSERT_TRUE(qtyConvertUnit(kStandardGravity, 1.0, findQuantity(110244)->units.front(), &out));
    EXPECT_EQ(out, 9.80665);
}

TEST(QtyTables, CheckedRationalArithmeticRefusesOverflow) {
    const Rat big = rat(int64_t{1} << 40, 3);
    EXPECT_FALSE(ratMul(big, big).has_value());
    EXPECT_FALSE(ratSub(rat(1, int64_t{1} << 62), rat(1, (int64_t{1} << 62) - 1)).has_value());
    EXPECT_FALSE(ratDiv(rat(1), rat(0)).has_value());
    EXPECT_EQ(*ratMul(rat(3048, 10000), rat(12)), rat(4572, 1250));
    EXPECT_EQ(*ratSub(rat(1, 3), rat(1, 6)), rat(1, 6));
}
