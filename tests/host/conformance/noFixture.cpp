#include "HostFixture.h"

namespace HostFixture {

bool setJobCancelled(bool)
{
    return false;
}

template <> Volume<Traits2> makeVolume(Field, unsigned int)
{
    return {};
}

template <> Volume<Traits5> makeVolume(Field, unsigned int)
{
    return {};
}

}
