// A program that sets the clock, for the tests of the clock recorder: prints what the call returned.
#include <sys/time.h>

#include <cstdio>

int main() {
    timeval time{1234567890, 5};
    std::printf("%d\n", settimeofday(&time, nullptr));
}
