#include "zelkord/network/bag/BagFetchURL.h"

#include "base/Text.h"
#include "zelkord/network/exchange/URLComponents.h"

namespace zelkord {

BagFetchURL bagFetchURL(const SettingsStore& settings, std::string_view country) {
  auto chosen = stringSetting(settings, kBagURLSetting);
  const bool isMalformed = !chosen.empty() && !URLComponents::parse(chosen);
  if (!chosen.empty() && !isMalformed) return {std::move(chosen)};
  return {uppercased(country) == "CN" ? ZK_BAG_URL_CN : ZK_BAG_URL, isMalformed};
}

}  // namespace zelkord
