/* orvane-first-event LIBRARY RUNS: the time from loading the library to the
 * first OK of a first event, as a game sees it (the library opens libcrypto
 * and readies the cipher then), in RUNS fresh processes; prints the median
 * in microseconds. Run two libraries side by side to compare them. */
#define _POSIX_C_SOURCE 200809L
#include <dlfcn.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

static double now_us(void) {
  struct timespec t;
  clock_gettime(CLOCK_MONOTONIC, &t);
  return (double)t.tv_sec * 1e6 + (double)t.tv_nsec / 1e3;
}

static int compare(const void *a, const void *b) {
  const double x = *(const double *)a, y = *(const double *)b;
  return (x > y) - (x < y);
}

int main(int argc, char **argv) {
  if (argc != 3) return 2;
  const int runs = atoi(argv[2]);
  if (runs < 1 || runs > 1000) return 2;
  double times[1000];
  for (int r = 0; r < runs; ++r) {
    int pipe_fd[2];
    if (pipe(pipe_fd) != 0) return 1;
    const pid_t child = fork();
    if (child == 0) {
      const double start = now_us();
      void *lib = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
      int32_t (*enter)(const char *, const char *) =
          lib ? (int32_t(*)(const char *, const char *))dlsym(lib, "oAnalyticsGameEnter") : NULL;
      double took = enter && enter("first-event", "u1") == 0 ? now_us() - start : -1;
      _exit(write(pipe_fd[1], &took, sizeof took) == sizeof took ? 0 : 1);
    }
    close(pipe_fd[1]);
    if (read(pipe_fd[0], &times[r], sizeof times[r]) != sizeof times[r] || times[r] < 0) return 1;
    close(pipe_fd[0]);
    waitpid(child, NULL, 0);
  }
  qsort(times, (size_t)runs, sizeof times[0], compare);
  printf("%.0f\n", times[runs / 2]);
  return 0;
}
