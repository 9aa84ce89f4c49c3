#include <benchmark/benchmark.h>

// Benchmark names are "<case>/<implementation>": the library's runs are
// named "stbplat", the baseline of the same case carries the baseline's name.
// bench/run.sh pairs them by case.
BENCHMARK_MAIN();
