#include <iostream>

#include "frame/methods_page.h"

int main() { std::cout << zor::MethodsPage(); }
