// Item types and units of data-file items: the engine's own code table.
//
// Every item in a data file carries an item type code (what the values are: "Surface elevation",
// "Bathymetry", ...) and a unit code (what they are measured in). Each unit belongs to one unit
// kind (length, velocity, ...); each item type has one unit kind and a default unit of it.
// Values convert between units of one kind through the kind's base unit:
//   value in base unit = value * factor + offset.
#pragma once

#include <cstdint>
#include <span>
#include <string>

struct UnitKindInfo {
  std::int32_t kind;      // kind code
  const char* name;       // "Length", "Velocity", ...
  std::int32_t baseUnit;  // unit code of the base unit (factor 1, offset 0)
};

struct UnitInfo {
  std::int32_t code;         // unit code, e.g. 1000 for metre
  const char* name;          // "meter"
  const char* abbreviation;  // "m", shown in the log and in tables
  std::int32_t kind;         // UnitKindInfo::kind
  double factor;             // value * factor + offset = value in the base unit of the kind
  double offset;
  const char* udunits;       // UDUNITS-2 string written to data files ("m", "m/s", "degree")
};

struct ItemTypeInfo {
  std::int32_t code;         // item type code, e.g. 100079 for bathymetry
  const char* name;          // "Bathymetry"
  std::int32_t unitKind;     // UnitKindInfo::kind
  std::int32_t defaultUnit;  // unit code of the default unit
};

// Codes that stored files and other modules rely on.
inline constexpr std::int32_t kUnitMetre = 1000;
inline constexpr std::int32_t kUnitDegree = 2401;
inline constexpr std::int32_t kItemBathymetry = 100079;
inline constexpr std::int32_t kItemUndefined = 999;  // "Undefined" item type, dimensionless
inline constexpr std::int32_t kUnitUndefined = 0;    // "()" dimensionless

// Look-ups; nullptr when the code is not in the table.
const UnitKindInfo* FindUnitKind(std::int32_t kind);
const UnitInfo* FindUnit(std::int32_t code);
const ItemTypeInfo* FindItemType(std::int32_t code);

// The whole tables, in code order.
std::span<const UnitKindInfo> AllUnitKinds();
std::span<const UnitInfo> AllUnits();
std::span<const ItemTypeInfo> AllItemTypes();

// Default unit of an item type; kUnitUndefined when the item type is unknown.
std::int32_t DefaultUnitOfItemType(std::int32_t itemType);

// True when the item type's unit kind is `unitKind`.
bool ItemTypeHasUnitKind(std::int32_t itemType, std::int32_t unitKind);

// True when `unit` is a unit of the item type's unit kind.
bool ItemTypeAcceptsUnit(std::int32_t itemType, std::int32_t unit);

// Converts `value` from unit `from` to unit `to`. Both must be known units of one kind; else the
// value is left alone, false is returned and *error (when given) says why, e.g.
// "units 1000 (m) and 2000 (m/s) are of different kinds (Length, Velocity)".
bool ConvertUnit(double& value, std::int32_t from, std::int32_t to, std::string* error = nullptr);

// The factor and offset that take values from unit `from` to unit `to`
// (to_value = from_value * factor + offset); false as for ConvertUnit.
bool UnitConversion(std::int32_t from, std::int32_t to, double& factor, double& offset,
                    std::string* error = nullptr);
