// The vorcal tool (placeholder until its verbs land).
#include <cstdio>
#include <vorcal/vorcal.h>
int main()
{
    std::printf("%s\n", vorCAL_GetVersion());
    return 0;
}
