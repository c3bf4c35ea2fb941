#!/bin/sh
# Builds everything and runs every test: the Linux library, the Windows library under Wine, and both sanitizer builds.
# Installs what a fresh Debian 12 lacks. `./test.sh --help` lists finer choices.
set -u
cd "$(dirname "$0")" || exit 1
exec </dev/null

usage() {
  cat <<'END'
Usage: ./test.sh [choice ...]

Without a choice: --linux --asan --tsan --windows --clang. Choices run in the order given:

  --linux          release build for Linux, all tests
  --windows        release build for Windows (mingw-w64), all tests under Wine
  --windows-debug  the same without optimisation
  --asan           Linux tests with AddressSanitizer and UndefinedBehaviorSanitizer
  --tsan           Linux tests with ThreadSanitizer
  --clang          the library with clang, warnings as errors
  --coverage       Linux tests with gcov; prints the lines covered per source file
  --fuzz           every fuzz target for a minute (FUZZ_SECONDS=n changes that)
  --bench          benchmarks beside the peers; BENCH_FILTER=regex picks some
  --growth         how each job's time grows when its input doubles
  --soak SECONDS   a host that works on every processor for that long, then 10,000 times loading and unloading
  --tidy           clang-tidy over the library's sources
  --no-setup       do not look for missing packages first
  --help           this text

Full logs are in build/logs. The last line is always "N passed, N failed".
END
}

jobs=$(nproc 2>/dev/null || echo 2)
logs=build/logs
passed=0
failed=0
started=$(date +%s)
[ -n "${HOME:-}" ] || export HOME="$PWD/build"
if command -v ccache >/dev/null; then
  export CMAKE_C_COMPILER_LAUNCHER="${CMAKE_C_COMPILER_LAUNCHER-ccache}"
  export CMAKE_CXX_COMPILER_LAUNCHER="${CMAKE_CXX_COMPILER_LAUNCHER-ccache}"
fi

summary() {
  printf 'total time: %d s\n' $(($(date +%s) - started))
  echo "$passed passed, $failed failed"
}

give_up() { # <sentence>
  echo "$1"
  [ $failed -gt 0 ] || failed=1
  summary
  exit 1
}

# step <name> <stage> <command ...>: runs it with its output in a log; one line of progress; the first failure ends it all.
step() {
  name=$1 stage=$2
  shift 2
  log=$logs/$name.$stage.log
  printf '%-16s %-10s ' "$name" "$stage"
  begun=$(date +%s)
  "$@" >"$log" 2>&1
  result=$?
  [ "$stage" != test ] || count "$log"
  took=$(($(date +%s) - begun))
  if [ $result -eq 0 ]; then
    printf '%4d s%s\n' $took "${counted:-}"
    counted=
    return
  fi
  printf '%4d s  FAILED%s\n' $took "${counted:-}"
  explain "$stage" "$log"
  give_up "$name: $stage failed with exit code $result; the whole log is $log"
}

# Prints what matters of the log of a failed step.
explain() { # <stage> <log>
  case $1 in
    test)
      grep -E -A6 '^[0-9]+: .*(: Failure$|ERROR: |WARNING: ThreadSanitizer|runtime error: | error: |CMake Error)' "$2" | head -n 60
      grep -E '^[0-9]+: \[  FAILED  \] [^0-9]|^ *[0-9]+/[0-9]+ Test .*(\*\*\*|Exception)' "$2"
      ;;
    build) grep -E -A3 '^FAILED|error: |undefined reference' "$2" | grep -v '^: && \|^/usr/bin/ccache ' | cut -c1-300 | head -n 40 ;;
    *) tail -n 30 "$2" ;;
  esac
}

# Adds up a run of ctest: a GoogleTest program counts with its test cases, anything else as one.
count() { # <log of ctest -V>
  set -- $(tr -d '\r' <"$1" | awk '
    match($0, /^[0-9]+: \[  PASSED  \] [0-9]+ test/) { id = $1 + 0; sub(/.*\] /, ""); good[id] = $1 + 0; next }
    match($0, /^[0-9]+: \[  FAILED  \] [0-9]+ tests?, listed/) { id = $1 + 0; sub(/.*\] /, ""); bad[id] = $1 + 0; next }
    match($0, /^ *[0-9]+\/[0-9]+ Test +#[0-9]+: /) {
      ok = / Passed +[0-9.]+ sec/
      sub(/^[^#]*#/, ""); id = $1 + 0
      if (!(id in good)) good[id] = ok
      if (!(id in bad)) bad[id] = 0
      if (!ok && !bad[id]) bad[id] = 1
      seen[id] = 1
    }
    END { for (id in seen) { p += good[id]; f += bad[id] } print p + 0, f + 0 }')
  passed=$((passed + $1))
  failed=$((failed + $2))
  counted="   $1 passed, $2 failed"
}

build() { # <preset> [target ...]
  preset=$1
  shift
  step "$preset" configure cmake --preset "$preset"
  step "$preset" build cmake --build --preset "$preset" -j "$jobs" ${1:+--target "$@"}
}

suite() { # <preset>
  build "$1"
  # Wine's servers keep the output of the program that woke them, and ctest would wait until they end: wake them here.
  case $1 in windows*) tools/wine-run cmd /c exit >/dev/null 2>&1 ;; esac
  step "$1" test ctest --preset "$1" -V --timeout 300
}

fuzz() {
  build linux-fuzz
  for target in build/linux-fuzz/bin/*_fuzz; do
    name=$(basename "$target" _fuzz)
    mkdir -p "build/fuzz/$name"
    step "$name" fuzz env ASAN_OPTIONS=allocator_may_return_null=1 "$target" -max_total_time="${FUZZ_SECONDS:-60}" \
      -artifact_prefix="build/fuzz/$name." "build/fuzz/$name" "fuzz/corpus/$name"
  done
}

coverage() {
  find build/linux-coverage -name '*.gcda' -delete 2>/dev/null
  suite linux-coverage
  ( cd build/linux-coverage/source/TAVO/CMakeFiles/TAVO_objects.dir &&
    find . -name '*.gcda' | xargs gcov -n -r -s "$OLDPWD/source/TAVO" ) 2>/dev/null | awk '
    /^File / { file = substr($2, 2, length($2) - 2); next }
    /^Lines executed:/ && file != "" {
      split($0, a, /[:% ]+/); n = $NF + 0
      if (!(file in lines) || a[3] > best[file]) { lines[file] = n; best[file] = a[3] + 0 }
      file = ""
    }
    END {
      for (f in lines) { printf "%6.1f %% of %4d  %s\n", best[f], lines[f], f; all += lines[f]; hit += lines[f] * best[f] / 100 }
      if (all) printf "%6.1f %% of %4d  in all\n", 100 * hit / all, all
    }' | sort -k4
}

bench() {
  build linux-release tavo_bench
  step linux-release bench build/linux-release/bin/tavo_bench --benchmark_filter="${BENCH_FILTER:-.}" \
    --benchmark_out="$logs/bench.json" --benchmark_out_format=json
  cat "$logs/linux-release.bench.log"
}

growth() {
  build linux-release tavo_growth
  step linux-release growth build/linux-release/bin/tavo_growth
  cat "$logs/linux-release.growth.log"
}

soak() { # <seconds>
  build linux-release
  step linux-release soak build/linux-release/bin/tavo_soak "$1"
  cat "$logs/linux-release.soak.log"
  step linux-release reload env TAVO_LOAD_CYCLES=10000 build/linux-release/bin/tavo_loading_tests --gtest_filter='*Cycles*'
}

tidy() {
  step linux-clang configure cmake --preset linux-clang
  step linux-clang tidy sh -c 'find source/TAVO -name "*.cpp" ! -iname "*_win.cpp" | xargs -P "$0" -n 4 \
    clang-tidy -p build/linux-clang --quiet --warnings-as-errors="*"' "$jobs"
}

setup=1
windows=0
choices=
seconds=
awaited=
for argument; do
  if [ "$awaited" = 1 ]; then
    case $argument in '' | *[!0-9]*) echo "test.sh: --soak needs a number of seconds"; exit 2 ;; esac
    seconds=$argument awaited=
    continue
  fi
  case $argument in
    --soak) choices="$choices --soak" awaited=1 ;;
    --help | -h) usage; exit 0 ;;
    --no-setup) setup=0 ;;
    --windows | --windows-debug) windows=1 choices="$choices $argument" ;;
    --linux | --asan | --tsan | --clang | --coverage | --fuzz | --bench | --growth | --tidy) choices="$choices $argument" ;;
    *) echo "test.sh: unknown choice $argument"; usage; exit 2 ;;
  esac
done
[ -z "$awaited" ] || { echo "test.sh: --soak needs a number of seconds"; exit 2; }
if [ -z "$choices" ]; then
  choices="--linux --asan --tsan --windows --clang"
  windows=1
fi

mkdir -p $logs || give_up "test.sh: cannot write to $PWD/build"
if [ $setup = 1 ]; then
  [ $windows = 1 ] && step machine setup tools/setup || step machine setup tools/setup --no-windows
fi
needed="cmake ctest ninja c++"
[ $windows = 0 ] || needed="$needed x86_64-w64-mingw32-g++-posix wine"
for program in $needed; do
  command -v $program >/dev/null || give_up "test.sh: $program is missing: run tools/setup (it installs Debian's packages)"
done

for choice in $choices; do
  case $choice in
    --linux) suite linux-release ;;
    --windows) suite windows-release ;;
    --windows-debug) suite windows-debug ;;
    --asan) suite linux-asan ;;
    --tsan) suite linux-tsan ;;
    --clang) build linux-clang TAVO ;;
    --coverage) coverage ;;
    --fuzz) fuzz ;;
    --bench) bench ;;
    --growth) growth ;;
    --soak) soak "$seconds" ;;
    --tidy) tidy ;;
  esac
done
summary
