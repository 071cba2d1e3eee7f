# Running tests and counting them. To be sourced.

# run_ctest ARGUMENT...: runs ctest with the arguments, TEST_JOBS tests at once: two for each processor unless
# told otherwise, since system tests wait as long as they compute. The last line printed has the counts. A program
# of CTest may hold several tests, a system test file or, in a cross build, all of GoogleTest's: their
# own lines count then, not the program. Before them comes what failed, with the last lines that it
# printed. Returns ctest's status.
run_ctest() {
    local results status=0
    results=$(mktemp)
    ctest -j "${TEST_JOBS:-$((2 * $(nproc)))}" --output-junit "$results" --test-output-size-passed 10000000 \
        --test-output-size-failed 10000000 "$@" || status=$?
    count_tests "$results"
    rm -f "$results"
    return "$status"
}

count_tests() { # JUNIT_FILE
    awk '
        /<testcase / {
            name = $0; sub(/.*name="/, "", name); sub(/".*/, "", name)
            outcome = "passed"
            if ($0 ~ /status="fail"/) outcome = "failed"
            if ($0 ~ /status="(notrun|disabled)"/) outcome = "skipped"
            inside = 0
            inside_failed = 0
            explaining = 0
            lines = 0
        }
        { output[lines++] = $0 }
        explaining && /^#/ { print; next }
        { explaining = 0 }
        /(^|>)ok [0-9]+ .*# skip/ { skipped++; inside++; print "skipped: " $0; next }
        /(^|>)ok [0-9]+/ { passed++; inside++ }
        /(^|>)not ok [0-9]+/ {
            failed++; inside++; inside_failed++; explaining = 1; print "failed: " $0
        }
        /^\[       OK \] .* \([0-9]+ ms\)$/ { passed++; inside++ }
        /: Skipped$/ { getline reason }
        /^\[  SKIPPED \] .* \([0-9]+ ms\)$/ {
            skipped++; inside++; print "skipped: " $4 " # " reason
        }
        /^\[  FAILED  \] .* \([0-9]+ ms\)$/ {
            failed++; inside++; inside_failed++; print "failed: " $4
        }
        /<\/testcase>/ {
            # A program that fails without a failed test has crashed or run out of time.
            if (outcome == "failed" && !inside_failed) {
                failed++
                print "failed: " name
                for (i = lines > 40 ? lines - 40 : 0; i < lines; i++) print "    " output[i]
            }
            if (inside) next
            if (outcome == "skipped") { skipped++; print "skipped: " name }
            if (outcome == "passed") passed++
        }
        END { printf "%d passed, %d failed, %d skipped\n", passed, failed, skipped }
    ' "$1"
}
