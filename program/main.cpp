#include "Program.h"

int main(int argc, char** argv)
{
    return ModelingProgram::runProgram(argc, argv);
}
