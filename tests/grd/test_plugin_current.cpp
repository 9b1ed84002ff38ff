// Tests of the shipped example plug-in grdExt_7: current speed and direction
// derived from the velocity components of a file of data type 7, checked
// against hypot and atan2 computed here.
#include <cmath>
#include <numbers>

#include "test_plugin_support.h"

namespace grdtest {
namespace {

constexpr int32_t kVelocityX = 40202;
constexpr int32_t kVelocityY = 40203;
constexpr int32_t kCurrentSpeed = 40205;
constexpr int32_t kCurrentDirection = 40206;
constexpr int32_t kMetrePerSecond = 20700;
constexpr int32_t kDegree = 20601;
constexpr int32_t kMetre = 20100;
constexpr int32_t kElements = 6;  // a 3 x 2 grid
constexpr double kTimes[3] = {0.0, 1800.0, 3600.0};

class CurrentTest : public PluginTest {
protected:
    // Components at time step t: u float, v double; u has a delete value at
    // element 1, v at element 4.
    static std::vector<float> u(int32_t t) {
        std::vector<float> values = {0.5f, 1.0f, -0.25f, 0.0f, -1.5f + t, 0.75f * t};
        values[1] = F_DELETE_VALUE_FLOAT;
        return values;
    }
    static std::vector<double> v(int32_t t) {
        std::vector<double> values = {0.5, -2.0, -0.25, 0.0, 1.0, -0.5 + t};
        values[4] = F_DELETE_VALUE_DOUBLE;
        return values;
    }
    static std::vector<float> level(int32_t t) { return std::vector<float>(kElements, 2.0f + t); }

    // A file of type 4 with a level item and the two components on one EqD2
    // grid, three time steps; withComponents false leaves out v.
    void writeAndOpen(int32_t dataType, bool withComponents = true) {
        const std::string path = dir_.file("current.grd");
        makeFileHeader(3, F_NEQTIME_FIXEDSPACE_ALLITEMS);
        ASSERT_EQ(grdSetDataType(header_, dataType), 0);
        ASSERT_EQ(grdSetItemInfo(header_, grdItemD(header_, 2), kVelocityX, "U velocity", kMetrePerSecond, 1), 0);
        ASSERT_EQ(grdSetItemInfo(header_, grdItemD(header_, 3), withComponents ? kVelocityY : kVelocityX,
                                 "V velocity", kMetrePerSecond, 2),
                  0);
        for (int32_t k = 1; k <= 3; ++k)
            ASSERT_EQ(grdSetItemAxisEqD2(grdItemD(header_, k), kMetre, 3, 2, 100.0f, 200.0f, 10.0f, 20.0f), 0);
        create(path);
        for (int32_t t = 0; t < 3; ++t) {
            ASSERT_EQ(grdWriteItemTimeStep(header_, file_, kTimes[t], level(t).data()), 0);
            ASSERT_EQ(grdWriteItemTimeStep(header_, file_, kTimes[t], u(t).data()), 0);
            ASSERT_EQ(grdWriteItemTimeStep(header_, file_, kTimes[t], v(t).data()), 0);
        }
        close();
        open(path);
    }

    // Speed and direction (towards, clockwise from north) of time step t.
    static std::vector<float> expected(int32_t t, bool direction) {
        std::vector<float> out;
        for (int32_t i = 0; i < kElements; ++i) {
            const double x = u(t)[i], y = v(t)[i];
            if (u(t)[i] == F_DELETE_VALUE_FLOAT || y == F_DELETE_VALUE_DOUBLE) {
                out.push_back(F_DELETE_VALUE_FLOAT);
                continue;
            }
            double towards = std::atan2(x, y) * 180.0 / std::numbers::pi;
            if (towards < 0.0) towards += 360.0;
            out.push_back(static_cast<float>(direction ? towards : std::hypot(x, y)));
        }
        return out;
    }

    static void expectNear(const std::vector<float>& got, const std::vector<float>& want) {
        ASSERT_EQ(got.size(), want.size());
        for (size_t i = 0; i < got.size(); ++i) EXPECT_NEAR(got[i], want[i], 1e-5 * (1 + std::fabs(want[i]))) << i;
    }

    // Reads the five items of time step t in order and checks them.
    void expectTimeStep(int32_t t) {
        std::vector<float> f;
        std::vector<double> d;
        double time = -1.0;
        ASSERT_EQ(read(f, &time), 0);
        EXPECT_EQ(time, kTimes[t]);
        EXPECT_EQ(f, level(t));
        ASSERT_EQ(read(f), 0);
        EXPECT_EQ(f, u(t));
        ASSERT_EQ(read(d), 0);
        EXPECT_EQ(d, v(t));
        ASSERT_EQ(read(f), 0);
        expectNear(f, expected(t, false));
        ASSERT_EQ(read(f, &time), 0);
        expectNear(f, expected(t, true));
        EXPECT_EQ(time, kTimes[t]);
    }
};

TEST_F(CurrentTest, OffersSpeedAndDirectionOnTheComponentsGrid) {
    writeAndOpen(-7);
    ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    ASSERT_EQ(grdGetNoOfItems(header_), 5);
    const struct {
        int32_t itemNo, type, unit;
        const char* name;
    } derived[] = {{4, kCurrentSpeed, kMetrePerSecond, "Current speed"},
                   {5, kCurrentDirection, kDegree, "Current direction"}};
    for (const auto& want : derived) {
        const ItemHandle item = grdItemD(header_, want.itemNo);
        int32_t type = 0, unit = 0, dataType = 0, axisUnit = 0, nx = 0, ny = 0;
        const char* name = nullptr;
        float x0 = 0, y0 = 0, dx = 0, dy = 0;
        ASSERT_EQ(grdGetItemInfo(item, &type, nullptr, &name, &unit, nullptr, &dataType), 0);
        EXPECT_EQ(type, want.type);
        EXPECT_STREQ(name, want.name);
        EXPECT_EQ(unit, want.unit);
        EXPECT_EQ(dataType, RCF_FLOAT);
        ASSERT_EQ(grdGetItemAxisEqD2(item, &axisUnit, nullptr, &nx, &ny, &x0, &y0, &dx, &dy), 0);
        EXPECT_EQ(axisUnit, kMetre);
        EXPECT_EQ(std::make_pair(nx, ny), std::make_pair(3, 2));
        EXPECT_EQ(std::make_pair(x0, y0), std::make_pair(100.0f, 200.0f));
        EXPECT_EQ(std::make_pair(dx, dy), std::make_pair(10.0f, 20.0f));
        double minimum = 0.0;
        ASSERT_EQ(grdGetItemStatsGlobal(item, &minimum, nullptr, nullptr), 0);
        EXPECT_EQ(minimum, F_DELETE_VALUE_DOUBLE);  // not known before reading
    }
    const char* name = nullptr;
    ASSERT_EQ(grdGetItemInfo_(grdItemD(header_, 3), nullptr, &name, nullptr, nullptr), 0);
    EXPECT_STREQ(name, "V velocity");
}

TEST_F(CurrentTest, ReadsTheFileItemsAndTheDerivedOnes) {
    writeAndOpen(7);
    ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    for (int32_t t = 0; t < 3; ++t) expectTimeStep(t);
    EXPECT_TRUE(reports().empty());
}

TEST_F(CurrentTest, SkipsAndPositioning) {
    writeAndOpen(7);
    ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    for (int32_t k = 0; k < 4; ++k) ASSERT_EQ(grdSkipItem(header_, file_), 0);
    std::vector<float> f;
    ASSERT_EQ(read(f), 0);
    expectNear(f, expected(0, true));
    ASSERT_EQ(grdSkipTimeStep(header_, file_), 0);
    expectTimeStep(2);
    ASSERT_EQ(grdFindItemDynamic(header_, file_, 1, 4), 0);
    ASSERT_EQ(read(f), 0);
    expectNear(f, expected(1, false));
}

TEST_F(CurrentTest, UnitConversionsOfTheCallerApplyOnceToWhatThePluginDelivers) {
    writeAndOpen(7);
    const int32_t centimetrePerSecond = unitTag("cm/s");
    const int32_t knot = unitTag("knot");
    // u in cm/s, asked for before the plug-in is loaded: the plug-in still
    // derives from m/s. Speed in knots.
    ASSERT_EQ(grdSetItemUnitConversion(grdItemD(header_, 2), 2, centimetrePerSecond), 0);
    ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    ASSERT_EQ(grdSetItemUnitConversion(grdItemD(header_, 4), 2, knot), 0);
    std::vector<float> f;
    ASSERT_EQ(read(f), 0);
    ASSERT_EQ(read(f), 0);
    std::vector<float> want = u(0);
    for (float& x : want)
        if (x != F_DELETE_VALUE_FLOAT) x = static_cast<float>(convert(kMetrePerSecond, x, centimetrePerSecond));
    expectNear(f, want);
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    ASSERT_EQ(read(f), 0);
    want = expected(0, false);
    for (float& x : want)
        if (x != F_DELETE_VALUE_FLOAT) x = static_cast<float>(convert(kMetrePerSecond, x, knot));
    expectNear(f, want);
}

TEST_F(CurrentTest, RefusesAFileWithoutBothComponents) {
    writeAndOpen(7, false);
    EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
    EXPECT_EQ(grdGetNoOfItems(header_), 3);
    EXPECT_FALSE(pluginLoaded(7));
}

}  // namespace
}  // namespace grdtest
