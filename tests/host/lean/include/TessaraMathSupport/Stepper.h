#pragma once

namespace Tessara::Math {

class Stepper {
public:
    Stepper(float amount, float limit);

    operator bool() const { return remainder_ > 0; }
    float increment() const { return remainder_ < limit_ ? remainder_ : limit_; }
    template <class Logger> void step(Logger const&) { remainder_ -= increment(); }

private:
    float remainder_, limit_;
};

}
