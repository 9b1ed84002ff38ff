// `tova demo [OUT]`: writes a sample gridded data file through the library's
// writing API: a 200 x 150 basin grid of 500 m cells in a map projection, its
// bathymetry as a static item, and the water level and both velocity
// components of a tidal wave over 48 hourly time steps on a calendar axis,
// with delete values over land and per-element statistics. Then it tells the
// user what to run next.
#include <algorithm>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <utility>
#include <vector>

#include "grd_access.h"
#include "grd_commands.h"
#include "qty/qty.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

constexpr int32_t kNx = 200;
constexpr int32_t kNy = 150;
constexpr float kCell = 500.0f;  // m
constexpr float kX0 = 420000.0f;  // easting and northing of the first cell centre
constexpr float kY0 = 5985000.0f;
constexpr int32_t kSteps = 48;
constexpr double kStepSeconds = 3600.0;
constexpr const char* kStartDate = "2024-03-21";
constexpr const char* kStartTime = "00:00:00";

// Quantities and units of the unit library.
constexpr int32_t kWaterLevel = 40101;
constexpr int32_t kBedLevel = 40103;
constexpr int32_t kVelocityX = 40202;
constexpr int32_t kVelocityY = 40203;
constexpr int32_t kMetre = 20100;
constexpr int32_t kMetrePerSecond = 20700;

constexpr double kPi = 3.14159265358979323846;
constexpr double kGravity = 9.81;
constexpr double kTidePeriod = 12.42 * 3600.0;  // the principal lunar tide, s
constexpr double kAmplitude = 1.2;             // m

// The basin: open sea to the west, a coast with a bay to the east, an island.
struct Basin {
    std::vector<float> bed = std::vector<float>(static_cast<size_t>(kNx) * kNy);
    std::vector<bool> land = std::vector<bool>(static_cast<size_t>(kNx) * kNy);

    Basin() {
        for (int32_t j = 0; j < kNy; ++j) {
            const double y = static_cast<double>(j) / (kNy - 1);
            // Coastline position along x, with a bay in the middle.
            const double coast = 0.82 + 0.06 * std::sin(2 * kPi * y * 1.5) - 0.18 * std::exp(-std::pow((y - 0.55) / 0.08, 2));
            for (int32_t i = 0; i < kNx; ++i) {
                const double x = static_cast<double>(i) / (kNx - 1);
                const double island = std::hypot((x - 0.45) / 0.05, (y - 0.3) / 0.07);
                const size_t e = static_cast<size_t>(j) * kNx + static_cast<size_t>(i);
                double level;
                if (x > coast) {
                    level = 2.0 + 40.0 * (x - coast);  // rising land
                } else {
                    // Deep in the west, shoaling towards the coast.
                    level = -(4.0 + 46.0 * std::pow((coast - x) / coast, 0.7));
                    if (island < 1.0) level = 3.0 * (1.0 - island);
                    else if (island < 2.0) level = std::max(level, -12.0 * (island - 1.0));
                }
                bed[e] = static_cast<float>(level);
                land[e] = level >= 0.0;
            }
        }
    }
};

// A tidal wave entering from the west, slowed and steepened by the shoaling
// bed, trapped against the southern side like a Kelvin wave.
struct Tide {
    float level;
    float u;
    float v;
};

Tide tideAt(int32_t i, int32_t j, double depth, double seconds) {
    const double omega = 2 * kPi / kTidePeriod;
    const double c = std::sqrt(kGravity * std::max(depth, 1.0));
    const double x = i * static_cast<double>(kCell);
    const double y = j * static_cast<double>(kCell);
    const double phase = omega * seconds - omega * x / std::sqrt(kGravity * 30.0);
    const double decay = std::exp(-y / 120000.0);
    const double eta = kAmplitude * decay * std::cos(phase);
    const double u = eta * c / std::max(depth, 1.0);
    // (+ 0.0: no negative zeros along the southern side.)
    const double v =
        0.15 * kAmplitude * decay * std::sin(phase) * std::sin(kPi * j / (kNy - 1)) * c / std::max(depth, 1.0) + 0.0;
    return {static_cast<float>(eta), static_cast<float>(u), static_cast<float>(v)};
}

void ok(int32_t status, const std::string& what) {
    if (status != F_NO_ERROR) throw Failure("demo: " + what + " failed: status " + statusText(status));
}

struct HeaderFree {
    void operator()(HeaderHandle h) const { grdHeaderDestroy(&h); }
};
using HeaderPtr = std::unique_ptr<std::remove_pointer_t<HeaderHandle>, HeaderFree>;

HeaderPtr makeHeader() {
    HeaderHandle made = nullptr;
    ok(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "Tidal wave in a coastal basin", "tova demo", 1, 3,
                       F_ITEM_STATS_ELEMENT, &made),
       "creating the header");
    HeaderPtr h(made);
    ok(grdSetDataType(h.get(), 0), "setting the data type");
    ok(grdSetGeoInfoUTMProj(h.get(), "UTM-32N", 9.0, 54.0, 0.0), "setting the projection");
    ok(grdSetEqCalendarAxis(h.get(), kStartDate, kStartTime, QTY_UNIT_SECOND, 0.0, kStepSeconds, 0),
       "setting the time axis");
    const struct {
        int32_t quantity;
        const char* name;
        int32_t unit;
    } items[3] = {{kWaterLevel, "Water level", kMetre},
                  {kVelocityX, "Current velocity x", kMetrePerSecond},
                  {kVelocityY, "Current velocity y", kMetrePerSecond}};
    for (int32_t n = 1; n <= 3; ++n) {
        const ItemHandle item = grdItemD(h.get(), n);
        const auto& d = items[n - 1];
        ok(grdSetItemInfo(h.get(), item, d.quantity, d.name, d.unit, RCF_FLOAT), std::string("item ") + d.name);
        ok(grdSetItemAxisEqD2(item, kMetre, kNx, kNy, kX0, kY0, kCell, kCell), std::string("axis of ") + d.name);
    }
    const double parameters[3] = {kGravity, kTidePeriod / 3600.0, kAmplitude};
    ok(grdAddCustomBlock(h.get(), RCF_DOUBLE, "gravity, tide period (h), amplitude (m)", 3, parameters),
       "adding a custom block");
    return h;
}

// Closes a file left open by a failure (the file is incomplete anyway).
struct OpenFile {
    HeaderHandle header;
    FileHandle file = nullptr;
    ~OpenFile() {
        if (file != nullptr) rcfFileClose(&file);
    }
};

}  // namespace

int runDemo(const DemoOptions& options) {
    const Basin basin;
    const HeaderPtr h = makeHeader();
    OpenFile out{h.get()};
    ok(grdFileCreate(options.out.c_str(), h.get(), &out.file), "creating " + options.out);

    {
        ItemHandle made = nullptr;
        ok(grdStaticCreate(&made), "creating the static item");
        const StaticPtr bathymetry(made);
        ok(grdStaticSetHeader(h.get(), made), "linking the static item");
        ok(grdSetItemInfo(h.get(), made, kBedLevel, "Bathymetry", kMetre, RCF_FLOAT), "the bathymetry item");
        ok(grdSetItemAxisEqD2(made, kMetre, kNx, kNy, kX0, kY0, kCell, kCell), "the bathymetry axis");
        ok(grdStaticWrite(made, out.file, basin.bed.data()), "writing the bathymetry");
    }

    const float deleteValue = grdGetDeleteValFloat(h.get());
    std::vector<float> level(basin.bed.size()), u(basin.bed.size()), v(basin.bed.size());
    for (int32_t t = 0; t < kSteps; ++t) {
        const double seconds = t * kStepSeconds;
        for (int32_t j = 0; j < kNy; ++j) {
            for (int32_t i = 0; i < kNx; ++i) {
                const size_t e = static_cast<size_t>(j) * kNx + static_cast<size_t>(i);
                if (basin.land[e]) {
                    level[e] = u[e] = v[e] = deleteValue;
                    continue;
                }
                const Tide tide = tideAt(i, j, -static_cast<double>(basin.bed[e]), seconds);
                level[e] = tide.level;
                u[e] = tide.u;
                v[e] = tide.v;
            }
        }
        for (const std::vector<float>* values : {&level, &u, &v}) {
            ok(grdWriteItemTimeStep(h.get(), out.file, seconds, values->data()),
               "writing time step " + std::to_string(t));
        }
    }
    ok(grdFileClose(h.get(), &out.file), "closing " + options.out);

    std::error_code ec;
    const auto bytes = std::filesystem::file_size(options.out, ec);
    const std::string shown = options.out.find(' ') == std::string::npos ? options.out : "\"" + options.out + "\"";
    char size[32];
    std::snprintf(size, sizeof(size), "%.1f MB", ec ? 0.0 : static_cast<double>(bytes) / 1e6);
    const std::pair<std::string, const char*> next[] = {
        {"tova info " + shown, "what the file holds"},
        {"tova dump " + shown + " --item 1 --step 24 --limit 10", "water levels a day after the start"},
        {"tova dump " + shown + " --static 1 --format csv", "the bathymetry as CSV"},
        {"tova stats " + shown, "minimum, maximum and mean of every item"},
        {"tova check " + shown, "a structural check"},
    };
    size_t width = 0;
    for (const auto& line : next) width = std::max(width, line.first.size());
    std::string text = "Wrote " + options.out + " (" + size + "): a gridded data file of " + std::to_string(kNx) +
                       " x " + std::to_string(kNy) +
                       " cells of 500 m with its bathymetry as a static\n"
                       "item and the water level and both current velocity components of a tidal wave at\n" +
                       std::to_string(kSteps) + " hourly time steps from " + kStartDate + " " + kStartTime +
                       " (delete values over land).\n\nNext, try:\n";
    for (const auto& [command, what] : next) {
        text += "  " + command + std::string(width - command.size() + 3, ' ') + what + "\n";
    }
    printOut(text);
    return kExitOk;
}

}  // namespace tova_cli
