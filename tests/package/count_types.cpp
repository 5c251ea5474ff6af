// Names no symbol of libtarn-types nor of the consumer's own library; linked with
// --as-needed, both must still be loaded for their types to be registered.
#include <iostream>
#include <string>

#include "orbit/Orbit.h"

int main() {
    int tarn = 0, quill = 0;
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) {
        if (type->GetName().starts_with("tarn.")) ++tarn;
        if (type->GetName().starts_with("quill.")) ++quill;
    }
    std::cout << "tarn types: " << tarn << "\nquill types: " << quill << "\n";
    return tarn > 0 ? 0 : 1;
}
