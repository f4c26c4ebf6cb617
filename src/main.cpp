#include "control/driver.hpp"

int main(int argc, char** argv) { return vhd::RunVantorHD(argc, argv); }
