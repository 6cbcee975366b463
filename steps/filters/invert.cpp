#include "filter_operation.h"

namespace picturezor::steps {

const Step Invert{
    .Name = "filter invert",
    .Help = "Invert the colours",
    .Make =
        [](const Values&, const Surroundings&) {
          return MakeFilter({.Name = "invert"}, [](const Picture& colours) {
            colours.Invert();
            return colours;
          });
        },
};

}
