#pragma once

#include <fstream>
#include <sstream>
#include <string>

#include "georef/rpc_georef.h"

namespace lumo::test {

/// Reads the numbers of an .RPB file that tests know to be whole.
inline RpcCoefficients LoadRpb(const std::string& path) {
  std::stringstream all;
  all << std::ifstream(path).rdbuf();
  const std::string text = all.str();
  const auto after = [&text](const std::string& key) {
    const std::size_t at = text.find(key);
    return at == std::string::npos ? std::string() : text.substr(text.find('=', at) + 1);
  };
  const auto number = [&after](const std::string& key) { return std::stod(after(key)); };
  const auto polynomial = [&after](const std::string& key) {
    RpcCoefficients::Polynomial terms{};
    std::string rest = after(key);
    for (double& term : terms) {
      const std::size_t start = rest.find_first_of("+-.0123456789");
      std::size_t used = 0;
      term = std::stod(rest.substr(start), &used);
      rest = rest.substr(start + used);
    }
    return terms;
  };
  RpcCoefficients rpc;
  rpc.lineOffset = number("lineOffset");
  rpc.sampleOffset = number("sampOffset");
  rpc.latitudeOffset = number("latOffset");
  rpc.longitudeOffset = number("longOffset");
  rpc.heightOffset = number("heightOffset");
  rpc.lineScale = number("lineScale");
  rpc.sampleScale = number("sampScale");
  rpc.latitudeScale = number("latScale");
  rpc.longitudeScale = number("longScale");
  rpc.heightScale = number("heightScale");
  rpc.lineNumerator = polynomial("lineNumCoef");
  rpc.lineDenominator = polynomial("lineDenCoef");
  rpc.sampleNumerator = polynomial("sampNumCoef");
  rpc.sampleDenominator = polynomial("sampDenCoef");
  return rpc;
}

}  // namespace lumo::test
