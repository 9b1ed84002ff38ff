// Unit library, tables: every unit, every quantity type with its unit
// sequence, and extra spellings accepted for unit symbols. Pure data, checked
// at compile time (sorted unique keys) and by the tests (unique texts,
// sequences matching dimensions).
//
// Numbering. Unit keys are 20000 + 100 * family + member, one family per
// dimension; unit 0 is the undefined unit and the second keeps the fixed key
// 1400. Quantity keys are 40000 + 100 * domain + member (1 water levels,
// 2 flow, 3 water quality, 4 waves, 5 meteorology, 6 general quantities);
// 999 (undefined), 100185-100188 (geometry) and the keys of the panel-body
// response file are fixed by the data files that carry them.
#pragma once

#include <algorithm>
#include <cstdint>
#include <iterator>

#include "qty/qty.h"
#include "qty/qty_model.h"

namespace qty {

// ---- Dimensions used by the tables ----------------------------------------

namespace dim {
inline constexpr Dim kNone{};
inline constexpr Dim kUndefined{{}, true};
inline constexpr Dim kLength = dimBase(Dim::kL);
inline constexpr Dim kMass = dimBase(Dim::kM);
inline constexpr Dim kTime = dimBase(Dim::kT);
inline constexpr Dim kTemperature = dimBase(Dim::kTheta);
inline constexpr Dim kAngle = dimBase(Dim::kA);
inline constexpr Dim kArea = kLength * kLength;
inline constexpr Dim kVolume = kArea * kLength;
inline constexpr Dim kFrequency = kNone / kTime;
inline constexpr Dim kVelocity = kLength / kTime;
inline constexpr Dim kAcceleration = kVelocity / kTime;
inline constexpr Dim kDischarge = kVolume / kTime;
inline constexpr Dim kAreaPerTime = kArea / kTime;  // discharge per width, diffusivity
inline constexpr Dim kDensity = kMass / kVolume;    // also mass concentration
inline constexpr Dim kForce = kMass * kAcceleration;
inline constexpr Dim kPressure = kForce / kArea;
inline constexpr Dim kForcePerLength = kForce / kLength;  // stiffness
inline constexpr Dim kMassRate = kMass / kTime;           // also damping N s/m
inline constexpr Dim kInertia = kMass * kArea;
inline constexpr Dim kAngularVelocity = kAngle / kTime;
inline constexpr Dim kWaveNumber = kAngle / kLength;
inline constexpr Dim kHeatFlux = kForce * kVelocity / kArea;  // W/m^2
inline constexpr Dim kMassFlux = kMassRate / kArea;             // precipitation as a mass flux
}  // namespace dim

// ---- Exact definitions, in coherent SI units --------------------------------

namespace def {
inline constexpr Rat kOne = rat(1);
inline constexpr Rat kFoot = rat(3048, 10000);  // international foot
inline constexpr Rat kFootUs = rat(1200, 3937);  // US survey foot
inline constexpr Rat kInch = kFoot / rat(12);
inline constexpr Rat kYard = kFoot * rat(3);
inline constexpr Rat kMile = kFoot * rat(5280);
inline constexpr Rat kSquareFoot = kFoot * kFoot;
inline constexpr Rat kCubicFoot = kSquareFoot * kFoot;
inline constexpr Rat kAcre = kSquareFoot * rat(43560);
inline constexpr Rat kGallonUs = kInch * kInch * kInch * rat(231);
inline constexpr Rat kMinute = rat(60);
inline constexpr Rat kHour = rat(3600);
inline constexpr Rat kDay = rat(86400);
inline constexpr Rat kPound = rat(45359237, 100000000);
inline constexpr Rat kStandardGravity = rat(980665, 100000);
inline constexpr Rat kPoundForce = kPound * kStandardGravity;
inline constexpr Rat kKelvinAtZeroCelsius = rat(27315, 100);
inline constexpr Rat kFahrenheitStep = rat(5, 9);
inline constexpr Rat kKelvinAtZeroFahrenheit = rat(45967, 100) * kFahrenheitStep;
}  // namespace def

// ---- Units -------------------------------------------------------------------

enum UnitKey : int32_t {
    kUnitUndefined = QTY_UNIT_UNDEFINED,
    kSecond = QTY_UNIT_SECOND,
    kUnitless = 20000, kPercent, kPermille, kPartPerMillion, kPartPerBillion, kGramPerKilogram, kPracticalSalinity,
    kMetre = 20100, kKilometre, kCentimetre, kMillimetre, kMicrometre, kFoot, kFootUs, kInch, kYard, kMile,
    kNauticalMile,
    kSquareMetre = 20200, kSquareKilometre, kHectare, kSquareCentimetre, kSquareFoot, kAcre, kSquareMile,
    kCubicMetre = 20300, kLitre, kMillilitre, kCubicHectometre, kCubicFoot, kGallonUs, kAcreFoot,
    kMinute = 20401, kHour, kDay, kWeek, kMillisecond,  // 20400 is left free: the second is 1400
    kHertz = 20500, kMillihertz, kPerSecond, kPerHour, kPerDay,
    kRadian = 20600, kDegree, kGon,
    kMetrePerSecond = 20700, kKilometrePerHour, kCentimetrePerSecond, kMillimetrePerSecond, kFootPerSecond, kKnot,
    kMilePerHour, kMetrePerDay, kMillimetrePerHour, kMillimetrePerDay, kInchPerHour, kInchPerDay,
    kMetrePerSecondSquared = 20800, kCentimetrePerSecondSquared, kFootPerSecondSquared, kStandardGravity,
    kCubicMetrePerSecond = 20900, kLitrePerSecond, kCubicMetrePerHour, kCubicMetrePerDay, kCubicFootPerSecond,
    kGallonUsPerMinute, kMegagallonUsPerDay, kAcreFootPerDay,
    kSquareMetrePerSecond = 21000, kSquareCentimetrePerSecond, kSquareMetrePerDay, kSquareFootPerSecond,
    kKilogram = 21100, kGram, kMilligram, kTonne, kPound,
    kKilogramPerCubicMetre = 21200, kGramPerCubicMetre, kMilligramPerLitre, kMicrogramPerLitre, kGramPerLitre,
    kGramPerCubicCentimetre, kTonnePerCubicMetre, kPoundPerCubicFoot,
    kDegreeCelsius = 21300, kKelvin, kDegreeFahrenheit,
    kPascal = 21400, kHectopascal, kKilopascal, kMegapascal, kMillibar, kBar, kAtmosphere, kPoundPerSquareInch,
    kMetreOfWater,
    kNewton = 21500, kKilonewton, kPoundForce,
    kNewtonPerMetre = 21600, kKilonewtonPerMetre, kPoundForcePerFoot,
    kKilogramPerSecond = 21700, kGramPerSecond, kTonnePerSecond, kTonnePerDay, kNewtonSecondPerMetre,
    kKilonewtonSecondPerMetre,
    kKilogramSquareMetre = 21800, kTonneSquareMetre, kPoundSquareFoot,
    kRadianPerSecond = 21900, kDegreePerSecond, kRevolutionPerMinute,
    kRadianPerMetre = 22000, kRadianPerFoot,
    kWattPerSquareMetre = 22100, kKilowattPerSquareMetre,
    kKilogramPerSquareMetrePerSecond = 22200, kKilogramPerSquareMetrePerDay, kGramPerSquareMetrePerSecond,
};

constexpr Unit unit(int32_t key, const char* text, const char* description, Dim d, Rat scale, int piPower = 0,
                    Rat offset = Rat{}) {
    return {key, text, description, d, scale, static_cast<int8_t>(piPower), offset};
}

// Sorted by key.
inline constexpr Unit kUnits[] = {
    unit(kUnitUndefined, "undefined", "undefined unit", dim::kUndefined, def::kOne),
    unit(kSecond, "s", "second", dim::kTime, def::kOne),

    unit(kUnitless, "-", "dimensionless number", dim::kNone, def::kOne),
    unit(kPercent, "%", "percent", dim::kNone, rat(1, 100)),
    unit(kPermille, "permille", "per mille (parts per thousand)", dim::kNone, rat(1, 1000)),
    unit(kPartPerMillion, "ppm", "parts per million (by mass)", dim::kNone, rat(1, 1000000)),
    unit(kPartPerBillion, "ppb", "parts per billion (by mass, 1e-9)", dim::kNone, rat(1, 1000000000)),
    unit(kGramPerKilogram, "g/kg", "gram per kilogram", dim::kNone, rat(1, 1000)),
    // Practical salinity is a conductivity ratio on a scale made to read in
    // parts per thousand; models treat it as such, and so do we.
    unit(kPracticalSalinity, "PSU", "practical salinity unit (parts per thousand)", dim::kNone, rat(1, 1000)),

    unit(kMetre, "m", "metre", dim::kLength, def::kOne),
    unit(kKilometre, "km", "kilometre", dim::kLength, rat(1000)),
    unit(kCentimetre, "cm", "centimetre", dim::kLength, rat(1, 100)),
    unit(kMillimetre, "mm", "millimetre", dim::kLength, rat(1, 1000)),
    unit(kMicrometre, "um", "micrometre", dim::kLength, rat(1, 1000000)),
    unit(kFoot, "ft", "foot (international, 0.3048 m)", dim::kLength, def::kFoot),
    unit(kFootUs, "ftUS", "US survey foot (1200/3937 m)", dim::kLength, def::kFootUs),
    unit(kInch, "in", "inch (25.4 mm)", dim::kLength, def::kInch),
    unit(kYard, "yd", "yard (0.9144 m)", dim::kLength, def::kYard),
    unit(kMile, "mi", "mile (international, 1609.344 m)", dim::kLength, def::kMile),
    unit(kNauticalMile, "nmi", "nautical mile (1852 m)", dim::kLength, rat(1852)),

    unit(kSquareMetre, "m^2", "square metre", dim::kArea, def::kOne),
    unit(kSquareKilometre, "km^2", "square kilometre", dim::kArea, rat(1000000)),
    unit(kHectare, "ha", "hectare", dim::kArea, rat(10000)),
    unit(kSquareCentimetre, "cm^2", "square centimetre", dim::kArea, rat(1, 10000)),
    unit(kSquareFoot, "ft^2", "square foot", dim::kArea, def::kSquareFoot),
    unit(kAcre, "acre", "acre (43560 ft^2)", dim::kArea, def::kAcre),
    unit(kSquareMile, "mi^2", "square mile", dim::kArea, def::kMile * def::kMile),

    unit(kCubicMetre, "m^3", "cubic metre", dim::kVolume, def::kOne),
    unit(kLitre, "l", "litre", dim::kVolume, rat(1, 1000)),
    unit(kMillilitre, "ml", "millilitre", dim::kVolume, rat(1, 1000000)),
    unit(kCubicHectometre, "hm^3", "cubic hectometre (million cubic metres)", dim::kVolume, rat(1000000)),
    unit(kCubicFoot, "ft^3", "cubic foot", dim::kVolume, def::kCubicFoot),
    unit(kGallonUs, "galUS", "US gallon (231 in^3)", dim::kVolume, def::kGallonUs),
    unit(kAcreFoot, "acre-ft", "acre-foot", dim::kVolume, def::kAcre * def::kFoot),

    unit(kMinute, "min", "minute", dim::kTime, def::kMinute),
    unit(kHour, "h", "hour", dim::kTime, def::kHour),
    unit(kDay, "day", "day (86400 s)", dim::kTime, def::kDay),
    unit(kWeek, "week", "week (7 days)", dim::kTime, def::kDay * rat(7)),
    unit(kMillisecond, "ms", "millisecond", dim::kTime, rat(1, 1000)),

    unit(kHertz, "Hz", "hertz", dim::kFrequency, def::kOne),
    unit(kMillihertz, "mHz", "millihertz", dim::kFrequency, rat(1, 1000)),
    unit(kPerSecond, "1/s", "per second", dim::kFrequency, def::kOne),
    unit(kPerHour, "1/h", "per hour", dim::kFrequency, rat(1) / def::kHour),
    unit(kPerDay, "1/day", "per day", dim::kFrequency, rat(1) / def::kDay),

    unit(kRadian, "rad", "radian", dim::kAngle, def::kOne),
    unit(kDegree, "deg", "degree", dim::kAngle, rat(1, 180), 1),
    unit(kGon, "gon", "gon (1/400 of a turn)", dim::kAngle, rat(1, 200), 1),

    unit(kMetrePerSecond, "m/s", "metre per second", dim::kVelocity, def::kOne),
    unit(kKilometrePerHour, "km/h", "kilometre per hour", dim::kVelocity, rat(1000) / def::kHour),
    unit(kCentimetrePerSecond, "cm/s", "centimetre per second", dim::kVelocity, rat(1, 100)),
    unit(kMillimetrePerSecond, "mm/s", "millimetre per second", dim::kVelocity, rat(1, 1000)),
    unit(kFootPerSecond, "ft/s", "foot per second", dim::kVelocity, def::kFoot),
    unit(kKnot, "knot", "knot (nautical mile per hour)", dim::kVelocity, rat(1852) / def::kHour),
    unit(kMilePerHour, "mph", "mile per hour", dim::kVelocity, def::kMile / def::kHour),
    unit(kMetrePerDay, "m/day", "metre per day", dim::kVelocity, rat(1) / def::kDay),
    unit(kMillimetrePerHour, "mm/h", "millimetre per hour", dim::kVelocity, rat(1, 1000) / def::kHour),
    unit(kMillimetrePerDay, "mm/day", "millimetre per day", dim::kVelocity, rat(1, 1000) / def::kDay),
    unit(kInchPerHour, "in/h", "inch per hour", dim::kVelocity, def::kInch / def::kHour),
    unit(kInchPerDay, "in/day", "inch per day", dim::kVelocity, def::kInch / def::kDay),

    unit(kMetrePerSecondSquared, "m/s^2", "metre per second squared", dim::kAcceleration, def::kOne),
    unit(kCentimetrePerSecondSquared, "cm/s^2", "centimetre per second squared (gal)", dim::kAcceleration,
         rat(1, 100)),
    unit(kFootPerSecondSquared, "ft/s^2", "foot per second squared", dim::kAcceleration, def::kFoot),
    unit(kStandardGravity, "g0", "standard acceleration of gravity (9.80665 m/s^2)", dim::kAcceleration,
         def::kStandardGravity),

    unit(kCubicMetrePerSecond, "m^3/s", "cubic metre per second", dim::kDischarge, def::kOne),
    unit(kLitrePerSecond, "l/s", "litre per second", dim::kDischarge, rat(1, 1000)),
    unit(kCubicMetrePerHour, "m^3/h", "cubic metre per hour", dim::kDischarge, rat(1) / def::kHour),
    unit(kCubicMetrePerDay, "m^3/day", "cubic metre per day", dim::kDischarge, rat(1) / def::kDay),
    unit(kCubicFootPerSecond, "ft^3/s", "cubic foot per second", dim::kDischarge, def::kCubicFoot),
    unit(kGallonUsPerMinute, "galUS/min", "US gallon per minute", dim::kDischarge, def::kGallonUs / def::kMinute),
    unit(kMegagallonUsPerDay, "MgalUS/day", "million US gallons per day", dim::kDischarge,
         def::kGallonUs * rat(1000000) / def::kDay),
    unit(kAcreFootPerDay, "acre-ft/day", "acre-foot per day", dim::kDischarge, def::kAcre * def::kFoot / def::kDay),

    unit(kSquareMetrePerSecond, "m^2/s", "square metre per second", dim::kAreaPerTime, def::kOne),
    unit(kSquareCentimetrePerSecond, "cm^2/s", "square centimetre per second", dim::kAreaPerTime, rat(1, 10000)),
    unit(kSquareMetrePerDay, "m^2/day", "square metre per day", dim::kAreaPerTime, rat(1) / def::kDay),
    unit(kSquareFootPerSecond, "ft^2/s", "square foot per second", dim::kAreaPerTime, def::kSquareFoot),

    unit(kKilogram, "kg", "kilogram", dim::kMass, def::kOne),
    unit(kGram, "g", "gram", dim::kMass, rat(1, 1000)),
    unit(kMilligram, "mg", "milligram", dim::kMass, rat(1, 1000000)),
    unit(kTonne, "t", "tonne (1000 kg)", dim::kMass, rat(1000)),
    unit(kPound, "lb", "pound (avoirdupois, 0.45359237 kg)", dim::kMass, def::kPound),

    unit(kKilogramPerCubicMetre, "kg/m^3", "kilogram per cubic metre", dim::kDensity, def::kOne),
    unit(kGramPerCubicMetre, "g/m^3", "gram per cubic metre", dim::kDensity, rat(1, 1000)),
    unit(kMilligramPerLitre, "mg/l", "milligram per litre", dim::kDensity, rat(1, 1000)),
    unit(kMicrogramPerLitre, "ug/l", "microgram per litre", dim::kDensity, rat(1, 1000000)),
    unit(kGramPerLitre, "g/l", "gram per litre", dim::kDensity, def::kOne),
    unit(kGramPerCubicCentimetre, "g/cm^3", "gram per cubic centimetre", dim::kDensity, rat(1000)),
    unit(kTonnePerCubicMetre, "t/m^3", "tonne per cubic metre", dim::kDensity, rat(1000)),
    unit(kPoundPerCubicFoot, "lb/ft^3", "pound per cubic foot", dim::kDensity, def::kPound / def::kCubicFoot),

    unit(kDegreeCelsius, "degC", "degree Celsius", dim::kTemperature, def::kOne, 0, def::kKelvinAtZeroCelsius),
    unit(kKelvin, "K", "kelvin", dim::kTemperature, def::kOne),
    unit(kDegreeFahrenheit, "degF", "degree Fahrenheit", dim::kTemperature, def::kFahrenheitStep, 0,
         def::kKelvinAtZeroFahrenheit),

    unit(kPascal, "Pa", "pascal", dim::kPressure, def::kOne),
    unit(kHectopascal, "hPa", "hectopascal", dim::kPressure, rat(100)),
    unit(kKilopascal, "kPa", "kilopascal", dim::kPressure, rat(1000)),
    unit(kMegapascal, "MPa", "megapascal", dim::kPressure, rat(1000000)),
    unit(kMillibar, "mbar", "millibar", dim::kPressure, rat(100)),
    unit(kBar, "bar", "bar", dim::kPressure, rat(100000)),
    unit(kAtmosphere, "atm", "standard atmosphere (101325 Pa)", dim::kPressure, rat(101325)),
    unit(kPoundPerSquareInch, "psi", "pound-force per square inch", dim::kPressure,
         def::kPoundForce / (def::kInch * def::kInch)),
    // Conventional metre of water: 1000 kg/m^3 under standard gravity.
    unit(kMetreOfWater, "mH2O", "conventional metre of water column (9806.65 Pa)", dim::kPressure,
         def::kStandardGravity * rat(1000)),

    unit(kNewton, "N", "newton", dim::kForce, def::kOne),
    unit(kKilonewton, "kN", "kilonewton", dim::kForce, rat(1000)),
    unit(kPoundForce, "lbf", "pound-force", dim::kForce, def::kPoundForce),

    unit(kNewtonPerMetre, "N/m", "newton per metre", dim::kForcePerLength, def::kOne),
    unit(kKilonewtonPerMetre, "kN/m", "kilonewton per metre", dim::kForcePerLength, rat(1000)),
    unit(kPoundForcePerFoot, "lbf/ft", "pound-force per foot", dim::kForcePerLength, def::kPoundForce / def::kFoot),

    unit(kKilogramPerSecond, "kg/s", "kilogram per second", dim::kMassRate, def::kOne),
    unit(kGramPerSecond, "g/s", "gram per second", dim::kMassRate, rat(1, 1000)),
    unit(kTonnePerSecond, "t/s", "tonne per second", dim::kMassRate, rat(1000)),
    unit(kTonnePerDay, "t/day", "tonne per day", dim::kMassRate, rat(1000) / def::kDay),
    unit(kNewtonSecondPerMetre, "N.s/m", "newton second per metre", dim::kMassRate, def::kOne),
    unit(kKilonewtonSecondPerMetre, "kN.s/m", "kilonewton second per metre", dim::kMassRate, rat(1000)),

    unit(kKilogramSquareMetre, "kg.m^2", "kilogram square metre", dim::kInertia, def::kOne),
    unit(kTonneSquareMetre, "t.m^2", "tonne square metre", dim::kInertia, rat(1000)),
    unit(kPoundSquareFoot, "lb.ft^2", "pound square foot", dim::kInertia, def::kPound * def::kSquareFoot),

    unit(kRadianPerSecond, "rad/s", "radian per second", dim::kAngularVelocity, def::kOne),
    unit(kDegreePerSecond, "deg/s", "degree per second", dim::kAngularVelocity, rat(1, 180), 1),
    unit(kRevolutionPerMinute, "rpm", "revolution per minute", dim::kAngularVelocity, rat(2) / def::kMinute, 1),

    unit(kRadianPerMetre, "rad/m", "radian per metre", dim::kWaveNumber, def::kOne),
    unit(kRadianPerFoot, "rad/ft", "radian per foot", dim::kWaveNumber, rat(1) / def::kFoot),

    unit(kWattPerSquareMetre, "W/m^2", "watt per square metre", dim::kHeatFlux, def::kOne),
    unit(kKilowattPerSquareMetre, "kW/m^2", "kilowatt per square metre", dim::kHeatFlux, rat(1000)),

    unit(kKilogramPerSquareMetrePerSecond, "kg/m^2/s", "kilogram per square metre and second", dim::kMassFlux,
         def::kOne),
    unit(kKilogramPerSquareMetrePerDay, "kg/m^2/day", "kilogram per square metre and day", dim::kMassFlux,
         rat(1) / def::kDay),
    unit(kGramPerSquareMetrePerSecond, "g/m^2/s", "gram per square metre and second", dim::kMassFlux, rat(1, 1000)),
};

// Further spellings found in data files and typed by users. Symbols are
// case-sensitive (mHz is not MHz), so no case folding is done on unit texts.
inline constexpr Alias kUnitAliases[] = {
    {"sec", kSecond}, {"second", kSecond}, {"seconds", kSecond}, {"minute", kMinute}, {"minutes", kMinute},
    {"hour", kHour}, {"hours", kHour}, {"hr", kHour}, {"d", kDay}, {"days", kDay},
    {"meter", kMetre}, {"metre", kMetre}, {"meters", kMetre}, {"metres", kMetre}, {"feet", kFoot}, {"foot", kFoot},
    {"inch", kInch}, {"degree", kDegree}, {"degrees", kDegree}, {"radian", kRadian}, {"radians", kRadian},
    {"m2", kSquareMetre}, {"m3", kCubicMetre}, {"m/s2", kMetrePerSecondSquared}, {"m3/s", kCubicMetrePerSecond},
    {"m2/s", kSquareMetrePerSecond}, {"ft3/s", kCubicFootPerSecond}, {"cfs", kCubicFootPerSecond},
    {"kg/m3", kKilogramPerCubicMetre}, {"g/m3", kGramPerCubicMetre}, {"L", kLitre}, {"kt", kKnot},
    {"knots", kKnot}, {"kph", kKilometrePerHour}, {"psu", kPracticalSalinity}, {"\xC2\xB0" "C", kDegreeCelsius},
    {"\xC2\xB0" "F", kDegreeFahrenheit}, {"\xC2\xB0", kDegree}, {"1/d", kPerDay},
};

// ---- Unit sequences (first unit = base unit of the quantity) -----------------

namespace seq {
inline constexpr int32_t kUndefined[] = {kUnitUndefined};
inline constexpr int32_t kPlain[] = {kUnitless, kPercent, kPermille};
inline constexpr int32_t kMassFraction[] = {kPartPerMillion, kPartPerBillion, kPermille, kPercent, kUnitless};
inline constexpr int32_t kSalinity[] = {kPracticalSalinity, kGramPerKilogram, kPermille};
inline constexpr int32_t kHumidity[] = {kPercent, kUnitless};
inline constexpr int32_t kLength[] = {kMetre, kKilometre, kCentimetre, kMillimetre, kMicrometre, kFoot,
                                      kFootUs, kInch, kYard, kMile, kNauticalMile};
inline constexpr int32_t kLevel[] = {kMetre, kCentimetre, kMillimetre, kFoot, kFootUs, kInch};
inline constexpr int32_t kWaveHeight[] = {kMetre, kCentimetre, kFoot};
inline constexpr int32_t kRainDepth[] = {kMillimetre, kMetre, kInch};
inline constexpr int32_t kBodyLength[] = {kMetre, kCentimetre, kMillimetre, kFoot, kInch};
inline constexpr int32_t kArea[] = {kSquareMetre, kSquareKilometre, kHectare, kSquareCentimetre, kSquareFoot, kAcre,
                                    kSquareMile};
inline constexpr int32_t kPanelArea[] = {kSquareMetre, kSquareCentimetre, kSquareFoot};
inline constexpr int32_t kVolume[] = {kCubicMetre, kLitre, kMillilitre, kCubicHectometre, kCubicFoot, kGallonUs,
                                      kAcreFoot};
inline constexpr int32_t kTime[] = {kSecond, kMinute, kHour, kDay, kWeek, kMillisecond};
inline constexpr int32_t kWavePeriod[] = {kSecond, kMinute};
inline constexpr int32_t kFrequency[] = {kHertz, kMillihertz, kPerSecond, kPerHour, kPerDay};
inline constexpr int32_t kWaveFrequency[] = {kHertz, kMillihertz};
inline constexpr int32_t kRate[] = {kPerDay, kPerHour, kPerSecond};
inline constexpr int32_t kAngle[] = {kRadian, kDegree, kGon};
inline constexpr int32_t kDirection[] = {kDegree, kRadian, kGon};
inline constexpr int32_t kVelocity[] = {kMetrePerSecond, kCentimetrePerSecond, kMillimetrePerSecond,
                                        kKilometrePerHour, kFootPerSecond, kKnot, kMilePerHour, kMetrePerDay};
inline constexpr int32_t kWindSpeed[] = {kMetrePerSecond, kKilometrePerHour, kKnot, kMilePerHour, kFootPerSecond};
inline constexpr int32_t kPrecipitationRate[] = {kMillimetrePerHour, kMillimetrePerDay, kMetrePerSecond,
                                                 kInchPerHour, kInchPerDay};
inline constexpr int32_t kEvaporationRate[] = {kMillimetrePerDay, kMillimetrePerHour, kMetrePerSecond,
                                               kInchPerDay, kInchPerHour};
inline constexpr int32_t kAcceleration[] = {kMetrePerSecondSquared, kCentimetrePerSecondSquared,
                                            kFootPerSecondSquared, kStandardGravity};
inline constexpr int32_t kDischarge[] = {kCubicMetrePerSecond, kLitrePerSecond, kCubicMetrePerHour,
                                         kCubicMetrePerDay, kCubicFootPerSecond, kGallonUsPerMinute,
                                         kMegagallonUsPerDay, kAcreFootPerDay};
inline constexpr int32_t kSpecificDischarge[] = {kSquareMetrePerSecond, kSquareMetrePerDay, kSquareFootPerSecond};
inline constexpr int32_t kDiffusivity[] = {kSquareMetrePerSecond, kSquareCentimetrePerSecond, kSquareMetrePerDay,
                                           kSquareFootPerSecond};
inline constexpr int32_t kMass[] = {kKilogram, kGram, kMilligram, kTonne, kPound};
inline constexpr int32_t kBodyMass[] = {kKilogram, kTonne, kPound};
inline constexpr int32_t kConcentration[] = {kMilligramPerLitre, kGramPerCubicMetre, kKilogramPerCubicMetre,
                                             kMicrogramPerLitre, kGramPerLitre};
inline constexpr int32_t kDensity[] = {kKilogramPerCubicMetre, kGramPerCubicCentimetre, kTonnePerCubicMetre,
                                       kGramPerLitre, kPoundPerCubicFoot};
inline constexpr int32_t kTemperature[] = {kDegreeCelsius, kKelvin, kDegreeFahrenheit};
inline constexpr int32_t kPressure[] = {kPascal, kHectopascal, kKilopascal, kMegapascal, kMillibar, kBar,
                                        kAtmosphere, kPoundPerSquareInch, kMetreOfWater};
inline constexpr int32_t kAirPressure[] = {kHectopascal, kPascal, kKilopascal, kMillibar, kBar, kAtmosphere,
                                           kPoundPerSquareInch};
inline constexpr int32_t kPanelPressure[] = {kPascal, kKilopascal, kHectopascal, kPoundPerSquareInch};
inline constexpr int32_t kForce[] = {kNewton, kKilonewton, kPoundForce};
inline constexpr int32_t kForcePerLength[] = {kNewtonPerMetre, kKilonewtonPerMetre, kPoundForcePerFoot};
inline constexpr int32_t kMassRate[] = {kKilogramPerSecond, kGramPerSecond, kTonnePerDay};
inline constexpr int32_t kDamping[] = {kNewtonSecondPerMetre, kKilonewtonSecondPerMetre, kKilogramPerSecond,
                                       kTonnePerSecond};
inline constexpr int32_t kInertia[] = {kKilogramSquareMetre, kTonneSquareMetre, kPoundSquareFoot};
inline constexpr int32_t kAngularVelocity[] = {kRadianPerSecond, kDegreePerSecond, kRevolutionPerMinute};
inline constexpr int32_t kWaveAngularFrequency[] = {kRadianPerSecond, kDegreePerSecond};
inline constexpr int32_t kWaveNumber[] = {kRadianPerMetre, kRadianPerFoot};
inline constexpr int32_t kHeatFlux[] = {kWattPerSquareMetre, kKilowattPerSquareMetre};
inline constexpr int32_t kMassFlux[] = {kKilogramPerSquareMetrePerSecond, kKilogramPerSquareMetrePerDay,
                                        kGramPerSquareMetrePerSecond};
}  // namespace seq

// ---- Quantity types ------------------------------------------------------------

// Sorted by key.
inline constexpr Quantity kQuantities[] = {
    {QTY_ITEM_UNDEFINED, "Undefined", "Undefined quantity", dim::kUndefined, seq::kUndefined},

    {40101, "WaterLevel", "Water level (surface elevation above datum)", dim::kLength, seq::kLevel},
    {40102, "WaterDepth", "Water depth", dim::kLength, seq::kLevel},
    {40103, "BedLevel", "Bed level (bathymetry): elevation of the bed above datum", dim::kLength, seq::kLevel},
    {40104, "LayerThickness", "Thickness of a model layer", dim::kLength, seq::kLevel},

    {40201, "Velocity", "Flow velocity", dim::kVelocity, seq::kVelocity},
    {40202, "VelocityX", "Flow velocity, x-component (u)", dim::kVelocity, seq::kVelocity},
    {40203, "VelocityY", "Flow velocity, y-component (v)", dim::kVelocity, seq::kVelocity},
    {40204, "VelocityZ", "Flow velocity, vertical component (w)", dim::kVelocity, seq::kVelocity},
    {40205, "CurrentSpeed", "Current speed (magnitude of the horizontal velocity)", dim::kVelocity, seq::kVelocity},
    {40206, "CurrentDirection", "Current direction", dim::kAngle, seq::kDirection},
    {40207, "Speed", "Speed", dim::kVelocity, seq::kVelocity},
    {40208, "Discharge", "Discharge (volume flow rate)", dim::kDischarge, seq::kDischarge},
    {40209, "SpecificDischarge", "Discharge per unit width (flux)", dim::kAreaPerTime, seq::kSpecificDischarge},
    {40210, "SpecificDischargeX", "Discharge per unit width, x-component (P flux)", dim::kAreaPerTime,
     seq::kSpecificDischarge},
    {40211, "SpecificDischargeY", "Discharge per unit width, y-component (Q flux)", dim::kAreaPerTime,
     seq::kSpecificDischarge},
    {40212, "Direction", "Direction", dim::kAngle, seq::kDirection},
    {40213, "EddyViscosity", "Eddy viscosity or diffusivity", dim::kAreaPerTime, seq::kDiffusivity},

    {40301, "Temperature", "Temperature", dim::kTemperature, seq::kTemperature},
    {40302, "Salinity", "Salinity", dim::kNone, seq::kSalinity},
    {40303, "Concentration", "Mass concentration", dim::kDensity, seq::kConcentration},
    {40304, "MassFraction", "Mass fraction", dim::kNone, seq::kMassFraction},
    {40305, "Density", "Density", dim::kDensity, seq::kDensity},
    {40306, "DecayRate", "Decay or reaction rate", dim::kFrequency, seq::kRate},
    {40307, "HeatFlux", "Heat flux", dim::kHeatFlux, seq::kHeatFlux},
    {40308, "MassFlowRate", "Mass flow rate (load)", dim::kMassRate, seq::kMassRate},

    {40401, "SignificantWaveHeight", "Significant wave height", dim::kLength, seq::kWaveHeight},
    {40402, "WaveHeight", "Wave height", dim::kLength, seq::kWaveHeight},
    {40403, "WavePeriod", "Wave period", dim::kTime, seq::kWavePeriod},
    {40404, "PeakWavePeriod", "Peak wave period", dim::kTime, seq::kWavePeriod},
    {40405, "WaveDirection", "Wave direction", dim::kAngle, seq::kDirection},
    {40406, "MeanWaveDirection", "Mean wave direction", dim::kAngle, seq::kDirection},
    {40407, "WaveFrequency", "Wave frequency", dim::kFrequency, seq::kWaveFrequency},

    {40501, "WindSpeed", "Wind speed", dim::kVelocity, seq::kWindSpeed},
    {40502, "WindDirection", "Wind direction", dim::kAngle, seq::kDirection},
    {40503, "WindVelocityX", "Wind velocity, x-component", dim::kVelocity, seq::kWindSpeed},
    {40504, "WindVelocityY", "Wind velocity, y-component", dim::kVelocity, seq::kWindSpeed},
    {40505, "AirPressure", "Air pressure", dim::kPressure, seq::kAirPressure},
    {40506, "AirTemperature", "Air temperature", dim::kTemperature, seq::kTemperature},
    {40507, "PrecipitationRate", "Precipitation rate", dim::kVelocity, seq::kPrecipitationRate},
    {40508, "EvaporationRate", "Evaporation rate", dim::kVelocity, seq::kEvaporationRate},
    {40509, "Precipitation", "Precipitation depth", dim::kLength, seq::kRainDepth},
    {40510, "RelativeHumidity", "Relative humidity", dim::kNone, seq::kHumidity},
    {40511, "SolarRadiation", "Solar radiation (irradiance)", dim::kHeatFlux, seq::kHeatFlux},
    {40512, "PrecipitationFlux", "Precipitation as a mass flux", dim::kMassFlux, seq::kMassFlux},

    {40601, "Length", "Length", dim::kLength, seq::kLength},
    {40602, "Area", "Area", dim::kArea, seq::kArea},
    {40603, "Volume", "Volume", dim::kVolume, seq::kVolume},
    {40604, "Mass", "Mass", dim::kMass, seq::kMass},
    {40605, "Time", "Time (duration)", dim::kTime, seq::kTime},
    {40606, "Frequency", "Frequency", dim::kFrequency, seq::kFrequency},
    {40607, "Angle", "Angle", dim::kAngle, seq::kAngle},
    {40608, "Dimensionless", "Dimensionless number", dim::kNone, seq::kPlain},
    {40609, "Fraction", "Fraction", dim::kNone, seq::kPlain},
    {40610, "Pressure", "Pressure", dim::kPressure, seq::kPressure},
    {40611, "Acceleration", "Acceleration", dim::kAcceleration, seq::kAcceleration},
    {40612, "Force", "Force", dim::kForce, seq::kForce},
    {40613, "AngularVelocity", "Angular velocity", dim::kAngularVelocity, seq::kAngularVelocity},
    {40614, "MassFlux", "Mass flux (mass per area and time)", dim::kMassFlux, seq::kMassFlux},

    // Panel-body response quantities. The file fixes only key and element
    // count of each item; the meaning is our reading of those counts
    // (P panels, B bodies, N3 modes of motion, N4 frequencies, N7 headings).
    // Matrices over the modes mix translational and rotational entries; their
    // unit is that of the translational entries.
    {100085, "WaveAngularFrequency", "Wave angular frequency (one per frequency)", dim::kAngularVelocity,
     seq::kWaveAngularFrequency},
    {100144, "WaveExcitingForce", "Wave exciting force per unit wave amplitude (per heading, frequency, mode)",
     dim::kForcePerLength, seq::kForcePerLength},

    {QTY_ITEM_GEOMETRY_0D, "Geometry0D", "Geometry of a point item (length)", dim::kLength, seq::kLength},
    {QTY_ITEM_GEOMETRY_1D, "Geometry1D", "Geometry of a 1-D item (length)", dim::kLength, seq::kLength},
    {QTY_ITEM_GEOMETRY_2D, "Geometry2D", "Geometry of a 2-D item (length)", dim::kLength, seq::kLength},
    {QTY_ITEM_GEOMETRY_3D, "Geometry3D", "Geometry of a 3-D item (length)", dim::kLength, seq::kLength},

    // One scalar, default 0: the water depth of the site, 0 standing for deep water.
    {100280, "SiteWaterDepth", "Water depth at the bodies (0: infinite depth)", dim::kLength, seq::kBodyLength},
    // N7 values: the wave headings of the exciting forces.
    {100415, "WaveHeading", "Wave heading", dim::kAngle, seq::kDirection},
    // 12 per panel (4 vertices x 3), 3 per panel, 3 per body: points on the bodies.
    {100514, "BodyCoordinate", "Coordinate on a panel body (panel vertices and centres, body reference points)",
     dim::kLength, seq::kBodyLength},
    // 9 per body: a 3 x 3 inertia tensor.
    {100515, "BodyMomentOfInertia", "Mass moment of inertia of a body", dim::kInertia, seq::kInertia},
    // One per panel.
    {110030, "PanelArea", "Panel area", dim::kArea, seq::kPanelArea},
    // Two of the five per-body values: the attitude angles (heel and trim).
    {110220, "BodyAttitude", "Attitude angle of a body (heel, trim)", dim::kAngle, seq::kDirection},
    // N3 per panel: the normal component of each unit mode shape on the panel.
    {110243, "PanelModeNormal", "Normal component of a mode shape on a panel", dim::kNone, seq::kPlain},
    // Scalar with default 9.80665.
    {110244, "GravityAcceleration", "Acceleration of gravity", dim::kAcceleration, seq::kAcceleration},
    // One per body.
    {110245, "BodyMass", "Mass of a body", dim::kMass, seq::kBodyMass},
    // N3 x N3: the hydrostatic restoring matrix.
    {110246, "HydrostaticStiffness", "Hydrostatic restoring stiffness", dim::kForcePerLength, seq::kForcePerLength},
    // N4 values beside the frequencies: the wave numbers.
    {110247, "WaveNumber", "Wave number (one per frequency)", dim::kWaveNumber, seq::kWaveNumber},
    // P x N4 x N3, twice (real and imaginary part): pressure on each panel.
    {110248, "PanelPressure", "Hydrodynamic pressure on a panel (per frequency and mode)", dim::kPressure,
     seq::kPanelPressure},
    // N4 x N3 x N3: radiation damping matrices, one per frequency.
    {110250, "RadiationDamping", "Radiation damping", dim::kMassRate, seq::kDamping},
    // Three of the five per-body values: main dimensions (length, beam, draught).
    {110258, "BodyMainDimension", "Main dimension of a body (length, beam, draught)", dim::kLength,
     seq::kBodyLength},
    // N4 x N3 x N3: added-mass matrices, one per frequency.
    {110266, "AddedMass", "Added mass", dim::kMass, seq::kBodyMass},
};

// ---- Compile-time checks ------------------------------------------------------

template <class T, size_t N>
constexpr bool sortedUniqueKeys(const T (&table)[N]) {
    return std::adjacent_find(std::begin(table), std::end(table),
                              [](const T& a, const T& b) { return a.key >= b.key; }) == std::end(table);
}
static_assert(sortedUniqueKeys(kUnits), "unit keys must be sorted and unique");
static_assert(sortedUniqueKeys(kQuantities), "quantity keys must be sorted and unique");

inline constexpr int32_t kUnitCount = static_cast<int32_t>(std::size(kUnits));
inline constexpr int32_t kQuantityCount = static_cast<int32_t>(std::size(kQuantities));

}  // namespace qty
