#include "filter_operation.h"

namespace picturezor::steps {

const Step AutoLevel{
    .Name = "filter auto-level",
    .Help = "Stretch the levels from black to white",
    .Make =
        [](const Values&, const Surroundings&) {
          return MakeFilter({.Name = "auto-level", .Groups = Serves::RGB, .Needs = {}},
                            [](const Picture& colours) { return colours.AutoLevel() ? colours : Picture(); });
        },
};

}
