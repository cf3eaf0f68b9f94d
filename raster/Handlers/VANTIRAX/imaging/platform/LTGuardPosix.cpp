#include "imaging/ImagingLibrary.h"

LTGuard::LTGuard()
{
    pthread_mutex_init(&section, nullptr);
}

LTGuard::~LTGuard()
{
    pthread_mutex_destroy(&section);
}

void LTGuard::Enter()
{
    pthread_mutex_lock(&section);
}

void LTGuard::Leave()
{
    pthread_mutex_unlock(&section);
}
