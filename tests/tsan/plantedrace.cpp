// Two threads write one number without a word to each other. The race detector must say so, or the
// job that runs the tests under it proves nothing.

#include <cstdio>

int main() {
    int number = 0;
#pragma omp parallel num_threads(2) default(none) shared(number)
    for (int i = 0; i < 1000; ++i)
        ++number;
    std::printf("%d\n", number);
}
