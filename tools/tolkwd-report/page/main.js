// Puts the page together.

const kLasts = [
    [kHourSeconds, 'Last hour'],
    [kDaySeconds, 'Last day'],
    [7 * kDaySeconds, 'Last week'],
];

function byid(id) {
    return document.getElementById(id);
}

function headline(services, troubles) {
    const trouble = services.filter(({now}) => troubles.includes(now.word)).length;
    const all = counted(services.length, 'service', 'services');
    if (services.length === 0) {
        return 'No services';
    }
    return trouble === 0 ? `${all}, none in trouble` :
        `${counttext(trouble)} of ${all} in trouble`;
}

function writehead({services, troubles, log, clock, extent, loadfailed}) {
    byid('headline').textContent = headline(services, troubles);
    const dated = log.from !== null || services.length > 0;
    const [from, to] = log.from === null ? [extent.from, extent.to] : [log.from[0], log.to[0]];
    const end = Math.max(to, services.length > 0 ? d3.max(services, ({now}) => now.to) : to);
    byid('period').textContent = !dated ? 'The log tells no time.' : from === end ?
        `at ${clocktext(clock.at(from))}` :
        `${clocktext(clock.at(from))} to ${clocktext(clock.at(end))}, ${spantext(end - from)}`;
    const files = log.files.map((file) => (file === '-' ? 'standard input' : file));
    byid('source').textContent = files.length > 0 ? `from ${files.join(', ')}` : '';
    byid('failed').hidden = !loadfailed;
}

function writecounts({log}) {
    const parts = [
        `${counted(log.lines, 'line', 'lines')} read`,
        `${counted(log.messages, 'message', 'messages')} of tolkwd`,
        log.foreign > 0 ? `${counted(log.foreign, 'line', 'lines')} of others` : '',
        log.torn > 0 ? `${counted(log.torn, 'torn line', 'torn lines')}` : '',
        log.clockchanges > 0 ?
            `the clock was set back ${counted(log.clockchanges, 'time', 'times')}` : '',
    ];
    byid('counts').textContent = `${parts.filter((part) => part !== '').join(' \u00b7 ')}. ` +
        'Times are the local time of the log.';
}

function writerange(view, clock) {
    byid('range').textContent = view.whole ? 'All of the log is shown.' :
        `${clocktext(clock.at(view.from))} to ${clocktext(clock.at(view.to))}, ` +
            spantext(view.length);
    for (const id of ['out', 'all', 'back', 'forth']) {
        byid(id).setAttribute('aria-disabled', String(view.whole));
    }
}

function wirebuttons(view) {
    const wire = (id, action) => byid(id).addEventListener('click', action);
    wire('back', () => view.pan(-kPanShare));
    wire('forth', () => view.pan(kPanShare));
    wire('in', () => view.zoom(kZoomStep));
    wire('out', () => view.zoom(1 / kZoomStep));
    wire('all', () => view.all());
    for (const [seconds, text] of kLasts) {
        if (seconds < view.length) {
            const button = element('button', '', text);
            button.type = 'button';
            button.addEventListener('click', () => view.last(seconds));
            byid('lasts').append(button);
        }
    }
}

// Whatever changes the room that there is.
function followwindow(timelines) {
    window.addEventListener('scroll', () => timelines.ask(), {passive: true});
    new ResizeObserver(() => timelines.refresh()).observe(byid('chart'));
    window.addEventListener('resize', () => timelines.refresh());
    const paper = matchMedia('print');
    paper.addEventListener('change', () => timelines.print(paper.matches));
    window.addEventListener('beforeprint', () => timelines.print(true));
    window.addEventListener('afterprint', () => timelines.print(false));
}

function showempty({log}) {
    const notice = byid('empty');
    notice.hidden = false;
    notice.append(element('p', '', log.lines === 0 ? 'The log is empty.' :
        log.messages === 0 ? 'No line of this log is a message of tolkwd.' :
            'No message of this log names a service.'));
    notice.append(element('p', '', 'The daemon names each service when it begins to watch it, and ' +
        'again after each refresh of its configuration; a log that was just emptied tells ' +
        'nothing until then.'));
}

function writeshown(filter, shown, all) {
    const target = byid('shown');
    target.replaceChildren();
    if (!filter.idle) {
        const clear = element('button', 'link', 'Show all');
        clear.type = 'button';
        clear.addEventListener('click', () => filter.clear());
        target.append(element('span', '', shown === 0 ? 'No service is like that. ' :
            `${counttext(shown)} of ${counted(all, 'service', 'services')}. `), clear);
    }
}

function showservices(model) {
    byid('content').hidden = false;
    drawpatterns(model.states);
    const view = new View(model.extent, () => {
        writerange(view, model.clock);
        timelines.refresh();
    });
    const details = new Details(byid('details'), model.extent);
    const timelines = new Timelines({lines: byid('lines'), axis: byid('axis'), model, view, details});
    const list = () => {
        const shown = summary.order(filter.chosen(model.services));
        timelines.list(shown);
        summary.list(shown);
        writeshown(filter, shown.length, model.services.length);
    };
    const summary = new Summary(byid('table'), model.extent, list);
    const filter = new Filter({name: byid('name'), states: byid('states')}, model.services, list);
    wirebuttons(view);
    writerange(view, model.clock);
    drawlegend(byid('legend'), model);
    list();
    timelines.draw();
    listentokeys(timelines);
    listentogestures(timelines, byid('chart'));
    followwindow(timelines);
}

// How long it took from the start of this script until the page was on the screen.
function tellwhendrawn() {
    requestAnimationFrame(() => setTimeout(() => {
        performance.measure('drawn', 'begun');
        const [measure] = performance.getEntriesByName('drawn');
        document.documentElement.dataset.drawn = measure.duration.toFixed(1);
    }, 0));
}

performance.mark('begun');
followtheme(byid('theme'));
const model = readmodel(JSON.parse(byid('data').textContent));
writehead(model);
writecounts(model);
if (model.services.length > 0) {
    showservices(model);
} else {
    showempty(model);
}
tellwhendrawn();
