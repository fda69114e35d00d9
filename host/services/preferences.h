/// The user's preferences: a process-wide registry and the raster-layer preference in it.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <string>
#include <typeindex>
#include <utility>

/// A preference object of the registry.
class Preference {
 public:
  virtual ~Preference() = default;
};

/// How overviews of a raster layer are built unless a job says otherwise.
class RasterLayerPreference : public Preference {
 public:
  RasterLayerPreference(int overviewGenerationMethod, int decimationLevels)
      : method_(overviewGenerationMethod), decimation_(decimationLevels) {}

  /// 0 nearest, 1 average, 2 mode; anything else counts as nearest.
  int GetOverviewGenerationMethod() const { return method_; }
  /// 2 or 3; anything else counts as 2.
  int GetDecimationLevels() const { return decimation_; }

 private:
  int method_;
  int decimation_;
};

/// Keeps preference objects by their type and an instance name.
class PreferenceRegistry {
 public:
  /// The process-wide registry, or null when none is installed. Not owned by the caller.
  static PreferenceRegistry* Get();
  /// Installs (null: removes) the process-wide registry.
  static void Install(std::unique_ptr<PreferenceRegistry> registry);

  /// The preference of type `P` under `name`, or null. Owned by the registry.
  template <class P>
  const P* Find(const std::string& name) const {
    const auto found = entries_.find({std::type_index(typeid(P)), name});
    return found == entries_.end() ? nullptr : static_cast<const P*>(found->second.get());
  }

  /// Stores `preference` under its type and `name`, replacing the one that was there.
  template <class P>
  void Set(const std::string& name, P preference) {
    entries_[{std::type_index(typeid(P)), name}] = std::make_unique<P>(std::move(preference));
  }

 private:
  std::map<std::pair<std::type_index, std::string>, std::unique_ptr<Preference>> entries_;
};

namespace orin {

/// Path of the preference file: `$ORIN_PREFERENCES`, else `$XDG_CONFIG_HOME/orin/preferences.toml`,
/// else `$HOME/.config/orin/preferences.toml`; empty when none of the variables is set.
std::string PreferenceFilePath();
/// True when `$ORIN_PREFERENCES` names that file, so that somebody expects it to be there.
bool IsPreferenceFileNamed();

/// Reads a preference file into a new registry.
///
///     [raster-layer]
///     overview-method   = "average"   # or 1; nearest 0, average 1, mode 2
///     decimation-factor = 3           # 2 or 3
///
/// A file that cannot be read, is not TOML or holds a value that cannot be used is reported through
/// `Warning` with file and line, and the defaults apply; so is a key that has no meaning.
/// \param mustExist  a file that does not exist is reported, too
std::unique_ptr<PreferenceRegistry> LoadPreferences(const std::string& path,
                                                    bool mustExist = false);

}  // namespace orin
