#include "sqlomtrk.h"

// The process exit status is the low 8 bits of the run's result.
int main(int argc, char** argv) {
    return mtrkMain(argc, argv);
}
