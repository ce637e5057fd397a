// Item-type and unit code table: the fixed codes stored files rely on, the consistency of the
// tables, and unit conversion (factors, offsets, exact identity, round trips, errors).
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>
#include <set>
#include <string>

#include "io/Units.h"

namespace {

double Converted(double value, std::int32_t from, std::int32_t to) {
  std::string error;
  EXPECT_TRUE(ConvertUnit(value, from, to, &error)) << from << " -> " << to << ": " << error;
  return value;
}

TEST(Units, FixedCodesKeepTheirMeaning) {
  const UnitInfo* metre = FindUnit(kUnitMetre);
  ASSERT_NE(metre, nullptr);
  EXPECT_STREQ(metre->abbreviation, "m");
  EXPECT_STREQ(metre->udunits, "m");
  EXPECT_STREQ(FindUnitKind(metre->kind)->name, "Length");
  EXPECT_EQ(FindUnitKind(metre->kind)->baseUnit, kUnitMetre);

  const UnitInfo* degree = FindUnit(kUnitDegree);
  ASSERT_NE(degree, nullptr);
  EXPECT_STREQ(degree->udunits, "degree");
  EXPECT_STREQ(FindUnitKind(degree->kind)->name, "Angle");

  const UnitInfo* none = FindUnit(kUnitUndefined);
  ASSERT_NE(none, nullptr);
  EXPECT_STREQ(none->abbreviation, "()");
  EXPECT_STREQ(none->udunits, "1");

  const ItemTypeInfo* bathymetry = FindItemType(kItemBathymetry);
  ASSERT_NE(bathymetry, nullptr);
  EXPECT_STREQ(bathymetry->name, "Bathymetry");
  EXPECT_EQ(bathymetry->unitKind, metre->kind);
  EXPECT_EQ(bathymetry->defaultUnit, kUnitMetre);

  const ItemTypeInfo* undefined = FindItemType(kItemUndefined);
  ASSERT_NE(undefined, nullptr);
  EXPECT_STREQ(undefined->name, "Undefined");
  EXPECT_EQ(undefined->unitKind, none->kind);
  EXPECT_EQ(undefined->defaultUnit, kUnitUndefined);
}

TEST(Units, TablesAreSortedUniqueAndConsistent) {
  const auto kinds = AllUnitKinds();
  const auto units = AllUnits();
  const auto items = AllItemTypes();
  // Strictly ascending codes: no neighbour pair with the first >= the second.
  EXPECT_TRUE(std::ranges::adjacent_find(kinds, std::ranges::greater_equal{},
                                         &UnitKindInfo::kind) == kinds.end());
  EXPECT_TRUE(std::ranges::adjacent_find(units, std::ranges::greater_equal{}, &UnitInfo::code) ==
              units.end());
  EXPECT_TRUE(std::ranges::adjacent_find(items, std::ranges::greater_equal{},
                                         &ItemTypeInfo::code) == items.end());

  for (const UnitKindInfo& k : kinds) {
    EXPECT_EQ(FindUnitKind(k.kind), &k);
    const UnitInfo* base = FindUnit(k.baseUnit);
    ASSERT_NE(base, nullptr) << k.name;
    EXPECT_EQ(base->kind, k.kind) << k.name;
    EXPECT_EQ(base->factor, 1.0) << k.name;
    EXPECT_EQ(base->offset, 0.0) << k.name;
  }
  std::set<std::string> itemNames;
  for (const UnitInfo& u : units) {
    EXPECT_EQ(FindUnit(u.code), &u);
    EXPECT_NE(FindUnitKind(u.kind), nullptr) << u.code;
    EXPECT_EQ(u.code / 100, u.kind) << u.code << " lies outside its kind's block";
    EXPECT_GT(u.factor, 0.0) << u.code;
    EXPECT_NE(std::string(u.udunits), "") << u.code;
    EXPECT_NE(std::string(u.abbreviation), "") << u.code;
  }
  for (const ItemTypeInfo& i : items) {
    EXPECT_EQ(FindItemType(i.code), &i);
    EXPECT_TRUE(itemNames.insert(i.name).second) << "duplicate item name " << i.name;
    const UnitInfo* u = FindUnit(i.defaultUnit);
    ASSERT_NE(u, nullptr) << i.name;
    EXPECT_EQ(u->kind, i.unitKind) << i.name;
    EXPECT_EQ(DefaultUnitOfItemType(i.code), i.defaultUnit);
    EXPECT_TRUE(ItemTypeHasUnitKind(i.code, i.unitKind));
    EXPECT_TRUE(ItemTypeAcceptsUnit(i.code, i.defaultUnit));
  }
}

TEST(Units, LookUpsMissBetweenAndOutsideCodes) {
  for (std::int32_t code : {-1, 3, 999, 1005, 1099, 2402, 99999, 1000000}) {
    EXPECT_EQ(FindUnit(code), nullptr) << code;
  }
  for (std::int32_t code : {-1, 0, 998, 1000, 100005, 100078, 200000}) {
    EXPECT_EQ(FindItemType(code), nullptr) << code;
    EXPECT_EQ(DefaultUnitOfItemType(code), kUnitUndefined) << code;
  }
  EXPECT_EQ(FindUnitKind(1), nullptr);
  EXPECT_EQ(FindUnitKind(1000), nullptr);
  // The first and last entries are found (binary search edges).
  EXPECT_NE(FindUnit(AllUnits().front().code), nullptr);
  EXPECT_NE(FindUnit(AllUnits().back().code), nullptr);
  EXPECT_NE(FindItemType(AllItemTypes().back().code), nullptr);
}

TEST(Units, ResultItemsHaveTheirKindAndDefaultUnit) {
  struct Case { const char* name; std::int32_t defaultUnit; };
  const Case cases[] = {
      {"Surface elevation", kUnitMetre},   {"Total water depth", kUnitMetre},
      {"Current direction", kUnitDegree},  {"Wind direction", kUnitDegree},
      {"Mean wave direction", kUnitDegree}, {"Conv. angle", kUnitDegree},
      {"Drag coefficient", kUnitUndefined}, {"CFL number (HD)", kUnitUndefined},
      {"Saturation", kUnitUndefined},      {"Pressure head", kUnitMetre},
      {"Roughness height", kUnitMetre},    {"Maximum water depth", kUnitMetre}};
  for (const Case& c : cases) {
    const auto items = AllItemTypes();
    const auto it = std::ranges::find_if(
        items, [&](const ItemTypeInfo& i) { return std::string(i.name) == c.name; });
    ASSERT_NE(it, items.end()) << c.name;
    EXPECT_EQ(it->defaultUnit, c.defaultUnit) << c.name;
  }
  // Items whose kinds are easy to mix up: flux per width is not discharge, viscosity is not
  // flux per width, heat is not heat flux, times at maxima are times.
  const auto kindOf = [](const char* name) -> std::string {
    for (const ItemTypeInfo& i : AllItemTypes())
      if (std::string(i.name) == name) return FindUnitKind(i.unitKind)->name;
    return "missing";
  };
  EXPECT_EQ(kindOf("P flux"), kindOf("Q flux"));
  EXPECT_NE(kindOf("P flux"), kindOf("Discharge"));
  EXPECT_NE(kindOf("P flux"), kindOf("Eddy viscosity"));
  EXPECT_NE(kindOf("Total heat flux"), kindOf("Total heat"));
  EXPECT_EQ(kindOf("Accumulated discharge"), kindOf("Volume"));
  EXPECT_EQ(kindOf("Time at maximum current speed"), kindOf("Wave period"));
  EXPECT_EQ(kindOf("Duration above threshold"), "Time");
  EXPECT_EQ(kindOf("Precipitation rate"), kindOf("Infiltration rate"));
  EXPECT_NE(kindOf("Precipitation rate"), kindOf("U velocity"));
  EXPECT_EQ(kindOf("Bed shearstress - x-component"), kindOf("Rad. stress gradient x"));
}

TEST(Units, ItemTypeAcceptsOnlyUnitsOfItsKind) {
  const ItemTypeInfo* bathymetry = FindItemType(kItemBathymetry);
  for (const UnitInfo& u : AllUnits())
    EXPECT_EQ(ItemTypeAcceptsUnit(kItemBathymetry, u.code), u.kind == bathymetry->unitKind)
        << u.code;
  EXPECT_FALSE(ItemTypeAcceptsUnit(kItemBathymetry, 12345));
  EXPECT_FALSE(ItemTypeAcceptsUnit(4242, kUnitMetre));
  EXPECT_TRUE(ItemTypeAcceptsUnit(kItemUndefined, kUnitUndefined));
  EXPECT_FALSE(ItemTypeAcceptsUnit(kItemUndefined, kUnitMetre));
  EXPECT_FALSE(ItemTypeHasUnitKind(4242, FindUnit(kUnitMetre)->kind));
  EXPECT_FALSE(ItemTypeHasUnitKind(kItemBathymetry, FindUnit(kUnitDegree)->kind));
}

// Finds a unit by its abbreviation within the kind of `sameKindAs`.
std::int32_t Unit(const char* abbreviation, std::int32_t sameKindAs) {
  const std::int32_t kind = FindUnit(sameKindAs)->kind;
  for (const UnitInfo& u : AllUnits())
    if (u.kind == kind && std::string(u.abbreviation) == abbreviation) return u.code;
  ADD_FAILURE() << "no unit " << abbreviation;
  return kUnitUndefined;
}

TEST(Units, ConvertsKnownValues) {
  const std::int32_t m = kUnitMetre, ft = Unit("ft", m), km = Unit("km", m), mi = Unit("mi", m);
  EXPECT_DOUBLE_EQ(Converted(1.0, ft, m), 0.3048);
  EXPECT_DOUBLE_EQ(Converted(3.048, m, ft), 10.0);
  EXPECT_DOUBLE_EQ(Converted(1.0, mi, km), 1.609344);
  EXPECT_DOUBLE_EQ(Converted(1.0, Unit("nmi", m), m), 1852.0);

  const std::int32_t degC = DefaultUnitOfItemType(100201);  // temperature
  const std::int32_t degF = Unit("degF", degC), kelvin = Unit("K", degC);
  EXPECT_NEAR(Converted(100.0, degC, degF), 212.0, 1e-12);
  EXPECT_NEAR(Converted(-40.0, degF, degC), -40.0, 1e-12);
  EXPECT_NEAR(Converted(32.0, degF, degC), 0.0, 1e-12);
  EXPECT_NEAR(Converted(0.0, kelvin, degC), -273.15, 1e-12);
  EXPECT_NEAR(Converted(273.15, kelvin, degF), 32.0, 1e-12);
  EXPECT_NEAR(Converted(212.0, degF, kelvin), 373.15, 1e-12);

  const std::int32_t ms = DefaultUnitOfItemType(100100);  // U velocity
  EXPECT_NEAR(Converted(1.0, Unit("knot", ms), ms), 1852.0 / 3600.0, 1e-15);
  EXPECT_NEAR(Converted(36.0, Unit("km/h", ms), ms), 10.0, 1e-12);
  EXPECT_NEAR(Converted(1.0, Unit("ft/s", ms), Unit("knot", ms)), 0.3048 * 3600 / 1852, 1e-12);

  const std::int32_t rate = DefaultUnitOfItemType(100305);  // precipitation rate
  EXPECT_NEAR(Converted(3.6, Unit("mm/h", rate), rate), 1e-6, 1e-20);
  EXPECT_NEAR(Converted(86.4, Unit("mm/day", rate), Unit("mm/h", rate)), 3.6, 1e-12);

  EXPECT_NEAR(Converted(180.0, kUnitDegree, Unit("rad", kUnitDegree)), std::numbers::pi, 1e-15);
  const std::int32_t pa = DefaultUnitOfItemType(100304);  // air pressure
  EXPECT_NEAR(Converted(1013.25, Unit("hPa", pa), Unit("atm", pa)), 1.0, 1e-12);
  EXPECT_NEAR(Converted(1.0, Unit("mH2O", pa), Unit("kPa", pa)), 9.80665, 1e-12);
  EXPECT_NEAR(Converted(1.0, Unit("ha", 1100), Unit("m^2", 1100)), 1e4, 1e-9);
  EXPECT_NEAR(Converted(5.0, Unit("mg/l", 1700), Unit("g/m^3", 1700)), 5.0, 1e-12);

  double factor = 0, offset = 0;
  ASSERT_TRUE(UnitConversion(degC, degF, factor, offset));
  EXPECT_NEAR(factor, 1.8, 1e-14);
  EXPECT_NEAR(offset, 32.0, 1e-12);
}

TEST(Units, SameUnitIsExactAndRoundTripsStayClose) {
  const double values[] = {0.0, 1.0, -3.25, 123.456789, 9.87654321e7, 1.0 / 3.0, -1e-9};
  for (const UnitInfo& a : AllUnits()) {
    for (double v : values) {
      double same = v;
      ASSERT_TRUE(ConvertUnit(same, a.code, a.code));
      EXPECT_EQ(same, v) << a.code;  // bit for bit, also for units with an offset
    }
    double f = 0, o = 1;
    ASSERT_TRUE(UnitConversion(a.code, a.code, f, o));
    EXPECT_EQ(f, 1.0);
    EXPECT_EQ(o, 0.0);

    for (const UnitInfo& b : AllUnits()) {
      if (b.kind != a.kind) continue;
      ASSERT_TRUE(UnitConversion(a.code, b.code, f, o));
      // Offsets make values near them lose digits; scale the tolerance by them.
      const double offsetScale = (std::abs(a.offset) + std::abs(b.offset)) / a.factor;
      for (double v : values) {
        double x = v;
        ASSERT_TRUE(ConvertUnit(x, a.code, b.code));
        const double tolerance = 1e-12 * std::max({1e-300, std::abs(v), offsetScale});
        EXPECT_NEAR(x, v * f + o, 1e-12 * std::max({1e-300, std::abs(x), std::abs(o)}))
            << a.code << " -> " << b.code;
        ASSERT_TRUE(ConvertUnit(x, b.code, a.code));
        EXPECT_NEAR(x, v, tolerance) << a.code << " -> " << b.code << " -> " << a.code;
      }
    }
  }
}

TEST(Units, RefusesUnknownUnitsAndMixedKinds) {
  const std::int32_t ms = DefaultUnitOfItemType(100100);
  double value = 7.5;
  std::string error;
  EXPECT_FALSE(ConvertUnit(value, kUnitMetre, ms, &error));
  EXPECT_EQ(value, 7.5);
  EXPECT_EQ(error, "units 1000 (m) and " + std::to_string(ms) +
                       " (m/s) are of different kinds (Length, Velocity)");

  // Units that measure the same dimension but belong to different kinds do not mix either.
  error.clear();
  EXPECT_FALSE(ConvertUnit(value, ms, DefaultUnitOfItemType(100305), &error));
  EXPECT_NE(error.find("Rate of depth change"), std::string::npos) << error;

  error.clear();
  EXPECT_FALSE(ConvertUnit(value, 4321, kUnitMetre, &error));
  EXPECT_NE(error.find("4321"), std::string::npos) << error;
  error.clear();
  EXPECT_FALSE(ConvertUnit(value, kUnitMetre, 4322, &error));
  EXPECT_NE(error.find("4322"), std::string::npos) << error;
  EXPECT_FALSE(ConvertUnit(value, 4321, 4321, &error));  // unknown even when equal
  EXPECT_FALSE(ConvertUnit(value, kUnitMetre, 4321));     // no error text wanted
  EXPECT_EQ(value, 7.5);

  double factor = 2.0, offset = 3.0;
  EXPECT_FALSE(UnitConversion(kUnitMetre, kUnitDegree, factor, offset, &error));
  EXPECT_NE(error.find("different kinds"), std::string::npos) << error;
  EXPECT_FALSE(UnitConversion(kUnitMetre, -5, factor, offset));
}

}  // namespace
