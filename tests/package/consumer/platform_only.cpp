// Opens the database at argv[1] through the platform library alone.

#include <keloplatform/kelodb.h>

int main(int argc, char **argv) {
    DBConnect_tag *connection = KELODBConnect(nullptr, nullptr, nullptr, argc == 2 ? argv[1] : nullptr);
    return connection != nullptr && KELODBClose(connection) == 0 ? 0 : 1;
}
