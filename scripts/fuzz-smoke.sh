#!/usr/bin/env bash
# Builds the fuzz preset (the whole project with clang 14, ASan and UBSan, and
# the libFuzzer harnesses) and runs each fuzz target for a while, starting from
# its seeds and kept regressions. Any crash, sanitizer report, leak or hang
# fails the run; the input that caused it is copied to
# fuzz/regressions/<target>/, where the regular tests replay it once committed.
#   VORANT_FUZZ_SECONDS  time per target (default 30)
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh
cmake --preset fuzz >/dev/null
cmake --build --preset fuzz -j 2

seconds=${VORANT_FUZZ_SECONDS:-30}
findings=build/fuzz/findings
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
targets=(intel_hex svf part_file command_line srecord sfdp)
failed=()
for target in "${targets[@]}"; do
  mkdir -p "$findings/$target" "$scratch/$target"
  rm -f "$findings/$target"/*
  seeds=(fuzz/corpus/$target)
  [[ -d fuzz/regressions/$target ]] && seeds+=(fuzz/regressions/$target)
  echo "== fuzz_$target for ${seconds} s"
  # New inputs go to the scratch folder (the first one), never into the
  # committed seeds. A single input may take at most 10 s.
  if ! ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
      build/fuzz/bin/fuzz_$target -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 \
      -print_final_stats=1 -artifact_prefix="$findings/$target/" "$scratch/$target" "${seeds[@]}" \
      >"$findings/$target.log" 2>&1; then
    tail -n 40 "$findings/$target.log" >&2
    mkdir -p fuzz/regressions/$target
    for found in "$findings/$target"/*; do
      [[ -f $found ]] || continue
      cp "$found" fuzz/regressions/$target/
      echo "kept fuzz/regressions/$target/$(basename "$found")" >&2
    done
    failed+=("$target")
  else
    grep -E '^stat::number_of_executed_units|^Done [0-9]+ runs' "$findings/$target.log" || true
  fi
done

echo "fuzzing: $((${#targets[@]} - ${#failed[@]})) passed, ${#failed[@]} failed"
if ((${#failed[@]} > 0)); then
  echo "FAIL: fuzzing found problems in: ${failed[*]} (logs in $findings)" >&2
  exit 1
fi
