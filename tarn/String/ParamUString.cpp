#include "tarn/String/ParamUString.h"

#include <stdexcept>

namespace tarn {

void ParamUString::SetParameterAtIndex(std::size_t index, const UString& text) {
  if (index >= parameters_.size()) parameters_.resize(index + 1);
  parameters_[index] = text;
}

UString ParamUString::MakeParamString(const UString& format,
                                      const std::vector<UString>& parameters) {
  constexpr unsigned short kPercent = '%';
  UString result(format);
  const UString percent(kPercent);
  std::size_t pos = result.find(kPercent, 0);
  while (pos != UString::npos) {
    // The unit after "%": 0 stands in for the end of the text.
    const unsigned short next = pos + 1 < result.length() ? result[pos + 1] : 0;
    const UString* replacement = &percent;
    if (next != kPercent) {
      const bool isDigit = next >= '0' && next <= '9';
      const std::size_t index = isDigit ? static_cast<std::size_t>(next - '0') : parameters.size();
      if (index >= parameters.size()) throw std::out_of_range("invalid vector<T> subscript");
      replacement = &parameters[index];
    }
    result.replace(pos, 2, *replacement);
    pos = result.find(kPercent, pos + replacement->length());
  }
  return result;
}

}  // namespace tarn
