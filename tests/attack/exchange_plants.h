// Violations that are planted, to prove that they are found.
#ifndef TARNWICK_TESTS_ATTACK_EXCHANGE_PLANTS_H_
#define TARNWICK_TESTS_ATTACK_EXCHANGE_PLANTS_H_

#include <string>
#include <vector>

#include "tests/attack/judge.h"

// The names that --plant takes.
const std::vector<std::string>& ExchangePlants();

// One exchange in kPlantEvery has the violation: number kPlantFirst and those after it.
inline constexpr uint64_t kPlantEvery = 97;
inline constexpr uint64_t kPlantFirst = 96;

// The seconds that a call with the violation "slow" takes too long.
inline constexpr double kPlantedDelay = 0.4;

// Inside the measured call; in what came of it. Nothing happens for a name of the other one's.
void PlantInCall(const std::string& kind);
void PlantInExchange(const std::string& kind, HostileExchange* exchange, Played* played);

#endif  // TARNWICK_TESTS_ATTACK_EXCHANGE_PLANTS_H_
