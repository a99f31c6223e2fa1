// The floor of a program in C++: starts, prints one letter and exits.
#include <iostream>

int main() { std::cout << 'x'; }
