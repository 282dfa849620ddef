#pragma once

namespace TSR {

struct Canceller {
    struct ID {
        unsigned int value;
    };
    static void cancelID(ID& place);
};

}
