// The item-type and unit code table of the engine's data files.
//
// Code scheme (docs/units.md has the full tables):
// - Unit codes come in blocks of 100, one block per unit kind, and the kind code is the block
//   number: unit code / 100 == kind code. Kind 0 (dimensionless) holds units 0..99, kind 10
//   (length) 1000..1099, kind 20 (velocity) 2000..2099, kind 24 (angle) 2400..2499, and so on.
//   Within a block, xx00..xx09 are SI and metric units, xx10..xx19 foot-pound units, xx20..
//   other units (knot, nautical mile). xx00 is always the kind's base unit: the metre (1000),
//   the radian (2400; 2401 is the degree), the degree Celsius (1500), and so on.
// - Item type codes are 100000 + 100 * group + n, one group per subject (water surface and
//   depths, currents, water properties, atmosphere, heat exchange, bed and friction, waves,
//   numerics, infiltration, discharge and transport, flood statistics). Bathymetry (100079) sits
//   in the mesh-geometry part 100070..100079 of group 0. 999 is the lone "Undefined" item type.
//
// The tables are constexpr arrays sorted by code; look-ups are binary searches. The invariants
// the look-ups and conversions rely on are checked at compile time below.
#include "io/Units.h"

#include <algorithm>
#include <numbers>

namespace {

// Kind codes: the unit code block numbers.
enum Kind : std::int32_t {
  kDimensionless = 0,
  kLength = 10,
  kArea = 11,
  kVolume = 12,
  kTime = 13,
  kMass = 14,
  kTemperature = 15,
  kDensity = 16,
  kConcentration = 17,
  kSalinity = 18,
  kPressure = 19,
  kVelocity = 20,
  kAcceleration = 21,
  kDischarge = 22,
  kFluxPerWidth = 23,
  kAngle = 24,
  kFrequency = 25,
  kStress = 26,
  kHeatFlux = 27,
  kEnergyPerArea = 28,
  kDepthRate = 29,
  kKinematicViscosity = 30,
  kManningM = 31,
  kManningN = 32,
  kChezy = 33,
  kPower = 34,
  kEnergy = 35,
  kForce = 36,
  kReciprocalTime = 37,
  kMassFlow = 38,
};

constexpr UnitKindInfo kKinds[] = {
    {kDimensionless, "Dimensionless", 0},
    {kLength, "Length", 1000},
    {kArea, "Area", 1100},
    {kVolume, "Volume", 1200},
    {kTime, "Time", 1300},
    {kMass, "Mass", 1400},
    {kTemperature, "Temperature", 1500},
    {kDensity, "Density", 1600},
    {kConcentration, "Concentration", 1700},
    {kSalinity, "Salinity", 1800},
    {kPressure, "Pressure", 1900},
    {kVelocity, "Velocity", 2000},
    {kAcceleration, "Acceleration", 2100},
    {kDischarge, "Discharge", 2200},
    {kFluxPerWidth, "Flux per unit width", 2300},
    {kAngle, "Angle", 2400},
    {kFrequency, "Frequency", 2500},
    {kStress, "Stress", 2600},
    {kHeatFlux, "Heat flux", 2700},
    {kEnergyPerArea, "Energy per area", 2800},
    {kDepthRate, "Rate of depth change", 2900},
    {kKinematicViscosity, "Kinematic viscosity", 3000},
    {kManningM, "Manning number M", 3100},
    {kManningN, "Manning number n", 3200},
    {kChezy, "Chezy number", 3300},
    {kPower, "Power", 3400},
    {kEnergy, "Energy", 3500},
    {kForce, "Force", 3600},
    {kReciprocalTime, "Reciprocal time", 3700},
    {kMassFlow, "Mass flow", 3800},
};

constexpr double kFoot = 0.3048;
constexpr double kInch = 0.0254;
constexpr double kPound = 0.45359237;
constexpr double kHour = 3600.0;
constexpr double kDay = 86400.0;
constexpr double kGravity = 9.80665;  // standard gravity, for metre of water and psi

// Manning's and Chezy's coefficients have fractional powers of length, which UDUNITS-2 cannot
// express. Their strings keep the conventional notation; a UDUNITS-2 reader rejects them as
// unknown (rather than misreading them), and files identify these units by their unit code.
constexpr UnitInfo kUnits[] = {
    {0, "dimensionless", "()", kDimensionless, 1.0, 0.0, "1"},
    {1, "percent", "%", kDimensionless, 0.01, 0.0, "%"},
    {2, "per mille", "o/oo", kDimensionless, 1e-3, 0.0, "1e-3"},

    {1000, "meter", "m", kLength, 1.0, 0.0, "m"},
    {1001, "centimeter", "cm", kLength, 1e-2, 0.0, "cm"},
    {1002, "millimeter", "mm", kLength, 1e-3, 0.0, "mm"},
    {1003, "kilometer", "km", kLength, 1e3, 0.0, "km"},
    {1004, "micrometer", "um", kLength, 1e-6, 0.0, "um"},
    {1010, "foot", "ft", kLength, kFoot, 0.0, "ft"},
    {1011, "inch", "in", kLength, kInch, 0.0, "inch"},
    {1012, "yard", "yd", kLength, 3 * kFoot, 0.0, "yd"},
    {1013, "mile", "mi", kLength, 5280 * kFoot, 0.0, "mile"},
    {1020, "nautical mile", "nmi", kLength, 1852.0, 0.0, "nautical_mile"},

    {1100, "square meter", "m^2", kArea, 1.0, 0.0, "m2"},
    {1101, "square kilometer", "km^2", kArea, 1e6, 0.0, "km2"},
    {1102, "hectare", "ha", kArea, 1e4, 0.0, "hectare"},
    {1103, "square centimeter", "cm^2", kArea, 1e-4, 0.0, "cm2"},
    {1110, "square foot", "ft^2", kArea, kFoot * kFoot, 0.0, "ft2"},

    {1200, "cubic meter", "m^3", kVolume, 1.0, 0.0, "m3"},
    {1201, "liter", "l", kVolume, 1e-3, 0.0, "L"},
    {1202, "million cubic meters", "Mm^3", kVolume, 1e6, 0.0, "1e6 m3"},
    {1210, "cubic foot", "ft^3", kVolume, kFoot * kFoot * kFoot, 0.0, "ft3"},

    {1300, "second", "s", kTime, 1.0, 0.0, "s"},
    {1301, "minute", "min", kTime, 60.0, 0.0, "min"},
    {1302, "hour", "h", kTime, kHour, 0.0, "h"},
    {1303, "day", "day", kTime, kDay, 0.0, "day"},
    {1304, "millisecond", "ms", kTime, 1e-3, 0.0, "ms"},

    {1400, "kilogram", "kg", kMass, 1.0, 0.0, "kg"},
    {1401, "gram", "g", kMass, 1e-3, 0.0, "g"},
    {1402, "milligram", "mg", kMass, 1e-6, 0.0, "mg"},
    {1403, "tonne", "t", kMass, 1e3, 0.0, "tonne"},
    {1410, "pound", "lb", kMass, kPound, 0.0, "lb"},

    // Base: degree Celsius, the engine's working unit. K = C + 273.15, F = C * 9/5 + 32.
    {1500, "degree Celsius", "degC", kTemperature, 1.0, 0.0, "degC"},
    {1501, "kelvin", "K", kTemperature, 1.0, -273.15, "K"},
    {1510, "degree Fahrenheit", "degF", kTemperature, 5.0 / 9.0, -160.0 / 9.0, "degF"},

    {1600, "kilogram per cubic meter", "kg/m^3", kDensity, 1.0, 0.0, "kg m-3"},
    {1601, "gram per liter", "g/l", kDensity, 1.0, 0.0, "g L-1"},
    {1602, "gram per cubic centimeter", "g/cm^3", kDensity, 1e3, 0.0, "g cm-3"},
    {1610, "pound per cubic foot", "lb/ft^3", kDensity, kPound / (kFoot * kFoot * kFoot), 0.0,
     "lb ft-3"},

    {1700, "kilogram per cubic meter", "kg/m^3", kConcentration, 1.0, 0.0, "kg m-3"},
    {1701, "gram per cubic meter", "g/m^3", kConcentration, 1e-3, 0.0, "g m-3"},
    {1702, "milligram per liter", "mg/l", kConcentration, 1e-3, 0.0, "mg L-1"},
    {1703, "microgram per liter", "ug/l", kConcentration, 1e-6, 0.0, "ug L-1"},
    {1704, "gram per liter", "g/l", kConcentration, 1.0, 0.0, "g L-1"},
    {1705, "milligram per cubic meter", "mg/m^3", kConcentration, 1e-6, 0.0, "mg m-3"},

    // Practical salinity is dimensionless, on a per-mille-like scale.
    {1800, "practical salinity unit", "PSU", kSalinity, 1.0, 0.0, "1e-3"},
    {1801, "parts per thousand", "ppt", kSalinity, 1.0, 0.0, "1e-3"},

    {1900, "pascal", "Pa", kPressure, 1.0, 0.0, "Pa"},
    {1901, "hectopascal", "hPa", kPressure, 1e2, 0.0, "hPa"},
    {1902, "kilopascal", "kPa", kPressure, 1e3, 0.0, "kPa"},
    {1903, "bar", "bar", kPressure, 1e5, 0.0, "bar"},
    {1904, "millibar", "mbar", kPressure, 1e2, 0.0, "mbar"},
    {1905, "meter of water", "mH2O", kPressure, 1000.0 * kGravity, 0.0, "9806.65 Pa"},
    {1906, "standard atmosphere", "atm", kPressure, 101325.0, 0.0, "atm"},
    {1910, "pound-force per square inch", "psi", kPressure, kPound * kGravity / (kInch * kInch),
     0.0, "psi"},

    {2000, "meter per second", "m/s", kVelocity, 1.0, 0.0, "m s-1"},
    {2001, "centimeter per second", "cm/s", kVelocity, 1e-2, 0.0, "cm s-1"},
    {2002, "millimeter per second", "mm/s", kVelocity, 1e-3, 0.0, "mm s-1"},
    {2003, "kilometer per hour", "km/h", kVelocity, 1e3 / kHour, 0.0, "km h-1"},
    {2010, "foot per second", "ft/s", kVelocity, kFoot, 0.0, "ft s-1"},
    {2011, "mile per hour", "mph", kVelocity, 5280 * kFoot / kHour, 0.0, "mile h-1"},
    {2020, "knot", "knot", kVelocity, 1852.0 / kHour, 0.0, "knot"},

    {2100, "meter per second squared", "m/s^2", kAcceleration, 1.0, 0.0, "m s-2"},
    {2101, "centimeter per second squared", "cm/s^2", kAcceleration, 1e-2, 0.0, "cm s-2"},
    {2110, "foot per second squared", "ft/s^2", kAcceleration, kFoot, 0.0, "ft s-2"},

    {2200, "cubic meter per second", "m^3/s", kDischarge, 1.0, 0.0, "m3 s-1"},
    {2201, "liter per second", "l/s", kDischarge, 1e-3, 0.0, "L s-1"},
    {2202, "cubic meter per hour", "m^3/h", kDischarge, 1.0 / kHour, 0.0, "m3 h-1"},
    {2203, "cubic meter per day", "m^3/day", kDischarge, 1.0 / kDay, 0.0, "m3 day-1"},
    {2210, "cubic foot per second", "ft^3/s", kDischarge, kFoot * kFoot * kFoot, 0.0, "ft3 s-1"},

    {2300, "cubic meter per second per meter", "m^3/s/m", kFluxPerWidth, 1.0, 0.0, "m2 s-1"},
    {2301, "liter per second per meter", "l/s/m", kFluxPerWidth, 1e-3, 0.0, "L s-1 m-1"},
    {2310, "cubic foot per second per foot", "ft^3/s/ft", kFluxPerWidth, kFoot * kFoot, 0.0,
     "ft2 s-1"},

    {2400, "radian", "rad", kAngle, 1.0, 0.0, "rad"},
    {2401, "degree", "degree", kAngle, std::numbers::pi / 180.0, 0.0, "degree"},

    {2500, "hertz", "Hz", kFrequency, 1.0, 0.0, "Hz"},
    {2501, "kilohertz", "kHz", kFrequency, 1e3, 0.0, "kHz"},

    {2600, "newton per square meter", "N/m^2", kStress, 1.0, 0.0, "N m-2"},
    {2601, "pascal", "Pa", kStress, 1.0, 0.0, "Pa"},
    {2602, "kilonewton per square meter", "kN/m^2", kStress, 1e3, 0.0, "kN m-2"},

    {2700, "watt per square meter", "W/m^2", kHeatFlux, 1.0, 0.0, "W m-2"},
    {2701, "kilowatt per square meter", "kW/m^2", kHeatFlux, 1e3, 0.0, "kW m-2"},
    {2702, "megajoule per square meter per day", "MJ/m^2/day", kHeatFlux, 1e6 / kDay, 0.0,
     "MJ m-2 day-1"},

    {2800, "joule per square meter", "J/m^2", kEnergyPerArea, 1.0, 0.0, "J m-2"},
    {2801, "kilojoule per square meter", "kJ/m^2", kEnergyPerArea, 1e3, 0.0, "kJ m-2"},
    {2802, "megajoule per square meter", "MJ/m^2", kEnergyPerArea, 1e6, 0.0, "MJ m-2"},
    {2803, "kilowatt hour per square meter", "kWh/m^2", kEnergyPerArea, 1e3 * kHour, 0.0,
     "kW h m-2"},

    {2900, "meter per second", "m/s", kDepthRate, 1.0, 0.0, "m s-1"},
    {2901, "millimeter per second", "mm/s", kDepthRate, 1e-3, 0.0, "mm s-1"},
    {2902, "millimeter per hour", "mm/h", kDepthRate, 1e-3 / kHour, 0.0, "mm h-1"},
    {2903, "millimeter per day", "mm/day", kDepthRate, 1e-3 / kDay, 0.0, "mm day-1"},
    {2904, "centimeter per hour", "cm/h", kDepthRate, 1e-2 / kHour, 0.0, "cm h-1"},
    {2905, "meter per day", "m/day", kDepthRate, 1.0 / kDay, 0.0, "m day-1"},
    {2910, "inch per hour", "in/h", kDepthRate, kInch / kHour, 0.0, "inch h-1"},

    {3000, "square meter per second", "m^2/s", kKinematicViscosity, 1.0, 0.0, "m2 s-1"},
    {3001, "square centimeter per second", "cm^2/s", kKinematicViscosity, 1e-4, 0.0, "cm2 s-1"},
    {3010, "square foot per second", "ft^2/s", kKinematicViscosity, kFoot * kFoot, 0.0,
     "ft2 s-1"},

    {3100, "cube root of meter per second", "m^(1/3)/s", kManningM, 1.0, 0.0, "m^(1/3) s-1"},
    {3200, "second per cube root of meter", "s/m^(1/3)", kManningN, 1.0, 0.0, "s m^(-1/3)"},
    {3300, "square root of meter per second", "m^(1/2)/s", kChezy, 1.0, 0.0, "m^(1/2) s-1"},

    {3400, "watt", "W", kPower, 1.0, 0.0, "W"},
    {3401, "kilowatt", "kW", kPower, 1e3, 0.0, "kW"},
    {3402, "megawatt", "MW", kPower, 1e6, 0.0, "MW"},

    {3500, "joule", "J", kEnergy, 1.0, 0.0, "J"},
    {3501, "kilojoule", "kJ", kEnergy, 1e3, 0.0, "kJ"},
    {3502, "megajoule", "MJ", kEnergy, 1e6, 0.0, "MJ"},
    {3503, "kilowatt hour", "kWh", kEnergy, 1e3 * kHour, 0.0, "kW h"},

    {3600, "newton", "N", kForce, 1.0, 0.0, "N"},
    {3601, "kilonewton", "kN", kForce, 1e3, 0.0, "kN"},

    {3700, "per second", "1/s", kReciprocalTime, 1.0, 0.0, "s-1"},
    {3701, "per hour", "1/h", kReciprocalTime, 1.0 / kHour, 0.0, "h-1"},
    {3702, "per day", "1/day", kReciprocalTime, 1.0 / kDay, 0.0, "day-1"},

    {3800, "kilogram per second", "kg/s", kMassFlow, 1.0, 0.0, "kg s-1"},
    {3801, "gram per second", "g/s", kMassFlow, 1e-3, 0.0, "g s-1"},
    {3802, "tonne per day", "t/day", kMassFlow, 1e3 / kDay, 0.0, "tonne day-1"},
};

// Default units are the kind's base unit, except directions, which default to the degree.
constexpr ItemTypeInfo kItemTypes[] = {
    {kItemUndefined, "Undefined", kDimensionless, kUnitUndefined},

    // 1000xx: water surface and depths; 10007x: mesh geometry.
    {100000, "Surface elevation", kLength, 1000},
    {100001, "Still water depth", kLength, 1000},
    {100002, "Total water depth", kLength, 1000},
    {100003, "Water level", kLength, 1000},
    {100004, "Tidal potential", kLength, 1000},
    {100070, "Element area", kArea, 1100},
    {kItemBathymetry, "Bathymetry", kLength, kUnitMetre},

    // 1001xx: currents and fluxes.
    {100100, "U velocity", kVelocity, 2000},
    {100101, "V velocity", kVelocity, 2000},
    {100102, "Current speed", kVelocity, 2000},
    {100103, "Current direction", kAngle, kUnitDegree},
    {100110, "P flux", kFluxPerWidth, 2300},
    {100111, "Q flux", kFluxPerWidth, 2300},

    // 1002xx: water properties.
    {100200, "Density", kDensity, 1600},
    {100201, "Temperature", kTemperature, 1500},
    {100202, "Salinity", kSalinity, 1800},

    // 1003xx: atmosphere.
    {100300, "Wind U velocity", kVelocity, 2000},
    {100301, "Wind V velocity", kVelocity, 2000},
    {100302, "Wind speed", kVelocity, 2000},
    {100303, "Wind direction", kAngle, kUnitDegree},
    {100304, "Air pressure", kPressure, 1900},
    {100305, "Precipitation rate", kDepthRate, 2900},
    {100306, "Evaporation rate", kDepthRate, 2900},
    {100307, "Air temperature", kTemperature, 1500},
    {100310, "Drag coefficient", kDimensionless, kUnitUndefined},

    // 1004xx: heat exchange with the atmosphere; fluxes, then the heat they carry.
    {100400, "Convective heat flux", kHeatFlux, 2700},
    {100401, "Latent heat flux", kHeatFlux, 2700},
    {100402, "Solar radiation net heat flux", kHeatFlux, 2700},
    {100403, "Long wave heat net flux", kHeatFlux, 2700},
    {100404, "Total heat flux", kHeatFlux, 2700},
    {100410, "Convective heat", kEnergyPerArea, 2800},
    {100411, "Latent heat", kEnergyPerArea, 2800},
    {100412, "Solar radiation net heat", kEnergyPerArea, 2800},
    {100413, "Long wave heat net", kEnergyPerArea, 2800},
    {100414, "Total heat", kEnergyPerArea, 2800},

    // 1005xx: bed, friction and turbulence.
    {100500, "Bed shearstress", kStress, 2600},
    {100501, "Bed shearstress - x-component", kStress, 2600},
    {100502, "Bed shearstress - y-component", kStress, 2600},
    {100510, "Manning's M", kManningM, 3100},
    {100511, "Manning's n", kManningN, 3200},
    {100512, "Chezy number", kChezy, 3300},
    {100513, "Roughness height", kLength, 1000},
    {100520, "Grain diameter", kLength, 1000},
    {100530, "Eddy viscosity", kKinematicViscosity, 3000},

    // 1006xx: waves and wave forcing.
    {100600, "Significant wave height", kLength, 1000},
    {100601, "Wave period", kTime, 1300},
    {100602, "Mean wave direction", kAngle, kUnitDegree},
    {100603, "Peak wave period", kTime, 1300},
    {100610, "Rad. stress gradient x", kStress, 2600},
    {100611, "Rad. stress gradient y", kStress, 2600},

    // 1007xx: numerics.
    {100700, "CFL number (HD)", kDimensionless, kUnitUndefined},
    {100701, "Conv. angle", kAngle, kUnitDegree},

    // 1008xx: infiltration.
    {100800, "Infiltration rate", kDepthRate, 2900},
    {100801, "Saturation", kDimensionless, kUnitUndefined},
    {100802, "Infiltrated volume", kVolume, 1200},
    {100803, "Pressure head", kLength, 1000},
    {100804, "Conductance coefficient", kReciprocalTime, 3700},

    // 1009xx: discharge, volume and transported matter.
    {100900, "Discharge", kDischarge, 2200},
    {100901, "Accumulated discharge", kVolume, 1200},
    {100902, "Volume", kVolume, 1200},
    {100903, "Mass", kMass, 1400},
    {100904, "Concentration", kConcentration, 1700},
    {100905, "Mass flow", kMassFlow, 3800},

    // 1010xx: flood statistics over a run.
    {101000, "Maximum water depth", kLength, 1000},
    {101001, "Time at maximum water depth", kTime, 1300},
    {101002, "Maximum current speed", kVelocity, 2000},
    {101003, "Time at maximum current speed", kTime, 1300},
    {101004, "Duration above threshold", kTime, 1300},
    {101005, "Maximum surface elevation", kLength, 1000},
};

template <typename T, std::size_t N, typename Key>
constexpr const T* Find(const T (&table)[N], std::int32_t code, Key key) {
  const T* it = std::lower_bound(std::begin(table), std::end(table), code,
                                 [&](const T& entry, std::int32_t c) { return key(entry) < c; });
  return it != std::end(table) && key(*it) == code ? it : nullptr;
}

constexpr const UnitKindInfo* KindAt(std::int32_t kind) {
  return Find(kKinds, kind, [](const UnitKindInfo& k) { return k.kind; });
}
constexpr const UnitInfo* UnitAt(std::int32_t code) {
  return Find(kUnits, code, [](const UnitInfo& u) { return u.code; });
}
constexpr const ItemTypeInfo* ItemAt(std::int32_t code) {
  return Find(kItemTypes, code, [](const ItemTypeInfo& i) { return i.code; });
}

// The table invariants, checked when this file compiles.
template <typename T, std::size_t N, typename Key>
constexpr bool StrictlyAscending(const T (&table)[N], Key key) {
  for (std::size_t i = 1; i < N; ++i)
    if (!(key(table[i - 1]) < key(table[i]))) return false;
  return true;
}
static_assert(StrictlyAscending(kKinds, [](const UnitKindInfo& k) { return k.kind; }));
static_assert(StrictlyAscending(kUnits, [](const UnitInfo& u) { return u.code; }));
static_assert(StrictlyAscending(kItemTypes, [](const ItemTypeInfo& i) { return i.code; }));

constexpr bool UnitsFitTheirKinds() {
  for (const UnitInfo& u : kUnits)
    if (u.code / 100 != u.kind || KindAt(u.kind) == nullptr || !(u.factor > 0)) return false;
  return true;
}
static_assert(UnitsFitTheirKinds(), "each unit lies in its kind's block of codes");

constexpr bool KindsHaveBaseUnits() {
  for (const UnitKindInfo& k : kKinds) {
    const UnitInfo* base = UnitAt(k.baseUnit);
    if (k.baseUnit != k.kind * 100 || base == nullptr || base->kind != k.kind ||
        base->factor != 1.0 || base->offset != 0.0)
      return false;
  }
  return true;
}
static_assert(KindsHaveBaseUnits(), "each kind's base unit is xx00, with factor 1 and offset 0");

constexpr bool ItemDefaultsFit() {
  for (const ItemTypeInfo& i : kItemTypes) {
    const UnitInfo* u = UnitAt(i.defaultUnit);
    if (u == nullptr || u->kind != i.unitKind) return false;
  }
  return true;
}
static_assert(ItemDefaultsFit(), "each item type's default unit is of its unit kind");

static_assert(UnitAt(kUnitMetre)->kind == kLength && UnitAt(kUnitDegree)->kind == kAngle);
static_assert(UnitAt(kUnitUndefined)->kind == kDimensionless);
static_assert(ItemAt(kItemBathymetry)->defaultUnit == kUnitMetre);
static_assert(ItemAt(kItemUndefined)->defaultUnit == kUnitUndefined);

// Looks up both units of a conversion; on failure writes why into *error.
bool LookUpPair(std::int32_t from, std::int32_t to, const UnitInfo*& a, const UnitInfo*& b,
                std::string* error) {
  a = UnitAt(from);
  b = UnitAt(to);
  if (a == nullptr || b == nullptr) {
    if (error) *error = "unknown unit code " + std::to_string(a == nullptr ? from : to);
    return false;
  }
  if (a->kind != b->kind) {
    if (error) {
      *error = "units " + std::to_string(from) + " (" + a->abbreviation + ") and " +
               std::to_string(to) + " (" + b->abbreviation + ") are of different kinds (" +
               KindAt(a->kind)->name + ", " + KindAt(b->kind)->name + ")";
    }
    return false;
  }
  return true;
}

}  // namespace

const UnitKindInfo* FindUnitKind(std::int32_t kind) { return KindAt(kind); }
const UnitInfo* FindUnit(std::int32_t code) { return UnitAt(code); }
const ItemTypeInfo* FindItemType(std::int32_t code) { return ItemAt(code); }

std::span<const UnitKindInfo> AllUnitKinds() { return kKinds; }
std::span<const UnitInfo> AllUnits() { return kUnits; }
std::span<const ItemTypeInfo> AllItemTypes() { return kItemTypes; }

std::int32_t DefaultUnitOfItemType(std::int32_t itemType) {
  const ItemTypeInfo* item = ItemAt(itemType);
  return item ? item->defaultUnit : kUnitUndefined;
}

bool ItemTypeHasUnitKind(std::int32_t itemType, std::int32_t unitKind) {
  const ItemTypeInfo* item = ItemAt(itemType);
  return item != nullptr && item->unitKind == unitKind;
}

bool ItemTypeAcceptsUnit(std::int32_t itemType, std::int32_t unit) {
  const ItemTypeInfo* item = ItemAt(itemType);
  const UnitInfo* u = UnitAt(unit);
  return item != nullptr && u != nullptr && u->kind == item->unitKind;
}

bool ConvertUnit(double& value, std::int32_t from, std::int32_t to, std::string* error) {
  const UnitInfo* a;
  const UnitInfo* b;
  if (!LookUpPair(from, to, a, b, error)) return false;
  if (from == to) return true;  // no arithmetic, so no rounding
  value = (value * a->factor + a->offset - b->offset) / b->factor;
  return true;
}

bool UnitConversion(std::int32_t from, std::int32_t to, double& factor, double& offset,
                    std::string* error) {
  const UnitInfo* a;
  const UnitInfo* b;
  if (!LookUpPair(from, to, a, b, error)) return false;
  if (from == to) {
    factor = 1.0;
    offset = 0.0;
  } else {
    factor = a->factor / b->factor;
    offset = (a->offset - b->offset) / b->factor;
  }
  return true;
}
