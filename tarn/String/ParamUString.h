// ParamUString: a message template with numbered parameters.
//
// The format is a UString in which "%0" to "%9" stand for parameters 0 to 9
// and "%%" for a percent sign. Parameters may be set in any order after
// construction; GetString() substitutes them on demand. Percent signs inside
// parameter texts are inserted literally, never read as placeholders.
//
//   tarn::ParamUString message(format, fileName);   // format "%0 could not be opened"
//   message.SetParameterAtIndex(1, reason);
//   tarn::UString text = message.GetString();
//
// GetString() throws std::out_of_range ("invalid vector<T> subscript") when
// a placeholder names a missing parameter, a "%" is followed by anything but
// a digit or "%", or the format ends in a lone "%"; the object is unchanged.
// Not synchronised: one thread at a time.
#pragma once

#include <cstddef>
#include <type_traits>
#include <utility>
#include <vector>

#include "tarn/String/UString.h"

namespace tarn {

class ParamUString {
 public:
  ParamUString() = default;
  explicit ParamUString(const UString& format) : format_(format) {}
  // Parameters 0 to n - 1 from one to six texts.
  template <typename... Texts>
  requires(sizeof...(Texts) >= 1 && sizeof...(Texts) <= 6 &&
           (std::is_constructible_v<UString, const Texts&> && ...))
      ParamUString(const UString& format, const Texts&... texts)
      : format_(format) {
    SetParameters(texts...);
  }
  ParamUString(const ParamUString&) = default;
  ParamUString(ParamUString&&) noexcept = default;
  ParamUString& operator=(const ParamUString&) = default;
  ParamUString& operator=(ParamUString&&) noexcept = default;
  ~ParamUString() = default;

  // Removes all parameters, then sets parameters 0 to n - 1.
  template <typename... Texts>
  requires(sizeof...(Texts) >= 1 && sizeof...(Texts) <= 6 &&
           (std::is_constructible_v<UString, const Texts&> &&
            ...)) void SetParameters(const Texts&... texts) {
    parameters_.clear();
    parameters_.reserve(sizeof...(Texts));
    (parameters_.emplace_back(texts), ...);
  }

  // Extends the list with empty texts up to index if needed, then sets it.
  void SetParameterAtIndex(std::size_t index, const UString& text);

  void SetFormat(const UString& format) { format_ = format; }
  [[nodiscard]] const UString& GetFormat() const noexcept { return format_; }
  [[nodiscard]] const std::vector<UString>& GetParameters() const noexcept { return parameters_; }

  // The format with every placeholder substituted.
  [[nodiscard]] UString GetString() const { return MakeParamString(format_, parameters_); }

 private:
  static UString MakeParamString(const UString& format, const std::vector<UString>& parameters);

  UString format_;
  std::vector<UString> parameters_;
};

}  // namespace tarn
